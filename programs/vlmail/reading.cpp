#include "programs/vlmail/reading.h"

#include "programs/reader/document.h"
#include "programs/reader/letters.h"
#include "programs/vlmail/command.h"
#include "programs/vlmail/node_settings.h"
#include "programs/vlmail/utf8.h"

#include "vlservice/pack/page_saver.h"

#include <utility>

namespace VlMail {
namespace {

constexpr char const* DOCUMENT_KEY = "document";
constexpr char const* ERROR_KEY = "error";
constexpr char const* EXTRACT_PRESET_KEY = "extract_preset";
constexpr char const* PACK_PRESET_KEY = "pack_preset";
constexpr char const* LETTERS_KEY = "letters";
constexpr char const* PAGES_KEY = "pages";
constexpr char const* FIELDS_KEY = "fields";
constexpr char const* READY_KEY = "production_ready";
constexpr char const* MESSAGE_KEY = "message";
constexpr char const* PRIMARY_ADDRESS_KEY = "primary_address";

json::Value nameOrNull(Cfg::ExtractedField const* field) {
    return field ? json::Value(field->name()) : json::Value(json_null());
}

json::Object toJson(LetterReading const& letter) {
    json::Array pages;
    for (int const page : letter.pages)
        pages.append(page);
    std::string message;
    bool const ready = letter.isProductionReady(message);
    return {{PAGES_KEY, pages},
            {FIELDS_KEY, letter.fields.serialize()},
            {READY_KEY, ready},
            {MESSAGE_KEY, message},
            {PRIMARY_ADDRESS_KEY, nameOrNull(letter.fields.primaryAddressField())}};
}

LetterReading letterFrom(json::Object const& object) {
    LetterReading letter{{}, Cfg::ExtractedFields(object.get(FIELDS_KEY).toArray())};
    for (json::Value const& page : object.get(PAGES_KEY).toArray())
        letter.pages.push_back(static_cast<int>(page.toInt()));
    return letter;
}

std::string quoted(std::string const& text) { return '"' + text + '"'; }

std::string placeOf(NodeSettings const& settings) {
    return settings.file().empty() ? "the settings" : quoted(settings.file().string());
}

/// The library takes a field with a bad pattern for one that was not found; here it is said instead.
void requirePattern(std::string const& pattern, std::string const& whose, NodeSettings const& settings) {
    try {
        Cfg::ExtractPreset::match(pattern, std::string());
    } catch (std::exception const& bad) {
        throw Error("the pattern " + quoted(pattern) + " of " + whose + " cannot be used: " + bad.what() +
                    "; correct it in " + placeOf(settings));
    }
}

void requirePatterns(Cfg::ExtractPreset const& preset, NodeSettings const& settings) {
    for (Cfg::ExtractZone const& zone : preset.zones()) {
        for (Cfg::ExtractField const& field : zone.fields()) {
            std::string const whose = "field " + quoted(field.name()) + " in zone " + quoted(zone.name()) +
                                      " of the preset for " + quoted(preset.strRegex());
            requirePattern(field.strRegex(), whose, settings);
            requirePattern(field.validation().strRegex(), whose, settings);
        }
    }
}

std::pair<Cfg::ExtractPreset const&, Cfg::PackPreset const&>
findPresets(std::string const& name, Cfg::Presets const& presets, NodeSettings const& settings) {
    try {
        return presets.findMatch(name);
    } catch (std::exception const& failure) {
        throw Error(std::string(failure.what()) + "; correct the presets in " + placeOf(settings));
    }
}

std::vector<LetterReading> lettersOf(Reader::Document& document, Cfg::ExtractPreset const& preset) {
    std::vector<LetterReading> letters;
    for (Reader::Letter& letter : Reader::readLetters(document, preset))
        letters.push_back({std::move(letter.pages), std::move(letter.fields)});
    return letters;
}

std::vector<PageBlob> blobsOf(Reader::Document& document, LetterReading const& letter) {
    std::vector<PageBlob> blobs;
    if (!letter.whyNot().empty())
        return blobs;
    for (int const page : letter.pages) {
        std::string const pdf = document.singlePagePdf(page);
        blobs.push_back({page, PageSaverI::zipDbData(pdf.data(), pdf.size())});
    }
    return blobs;
}

} // namespace

std::string LetterReading::whyNot() const {
    std::string message;
    if (isProductionReady(message))
        return {};
    if (message.empty())
        return "no address to go to";
    return message;
}

json::Object DocumentReading::toJson() const {
    if (failed())
        return {{DOCUMENT_KEY, document}, {ERROR_KEY, error}};
    json::Value all(json_null());
    if (letters) {
        json::Array array;
        for (LetterReading const& letter : *letters)
            array.append(VlMail::toJson(letter));
        all = array;
    }
    return {{DOCUMENT_KEY, document},
            {EXTRACT_PRESET_KEY, extractPreset},
            {PACK_PRESET_KEY, packPreset},
            {LETTERS_KEY, all}};
}

DocumentReading DocumentReading::fromJson(json::Object const& object) {
    DocumentReading reading;
    reading.document = object.get(DOCUMENT_KEY).toString();
    reading.error = object.get(ERROR_KEY).textOrEmpty();
    if (reading.failed())
        return reading;
    reading.extractPreset = object.get(EXTRACT_PRESET_KEY).toString();
    reading.packPreset = object.get(PACK_PRESET_KEY).toString();
    json::Value const letters = object.get(LETTERS_KEY);
    if (!letters.isArray())
        return reading;
    reading.letters.emplace();
    for (json::Value const& letter : letters.toArray())
        reading.letters->push_back(letterFrom(letter.toObject()));
    return reading;
}

ReadResult readDocument(std::filesystem::path const& file, Cfg::Presets const& presets,
                        NodeSettings const& settings, WithPages withPages) {
    ReadResult result;
    DocumentReading& reading = result.reading;
    reading.document = file.filename().string();
    try {
        Reader::Document document = Reader::openDocument(file);
        auto const& [extractPreset, packPreset] = findPresets(reading.document, presets, settings);
        reading.extractPreset = extractPreset.strRegex();
        reading.packPreset = packPreset.name();
        if (extractPreset.isForAttachemnt())
            return result;
        requirePatterns(extractPreset, settings);
        reading.letters = lettersOf(document, extractPreset);
        for (LetterReading const& letter : *reading.letters) {
            result.pages.emplace_back();
            if (withPages == WithPages::Yes)
                result.pages.back() = blobsOf(document, letter);
        }
    } catch (std::exception const& failure) {
        reading.document = validUtf8(reading.document);
        reading.error = validUtf8(failure.what());
        result.pages.clear();
    }
    return result;
}

} // namespace VlMail
