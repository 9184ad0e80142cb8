#include "programs/vlmail/letters/reading.h"

#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/base/quoting.h"
#include "programs/base/read_file.h"
#include "programs/base/utf8.h"
#include "programs/mailing/page_blob.h"
#include "programs/reader/document.h"
#include "programs/reader/letters.h"
#include "programs/vlmail/letters/checking.h"
#include "programs/vlmail/letters/node_settings.h"
#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/letters/preset_index.h"

#include <algorithm>
#include <utility>

namespace VlMail {
namespace {

namespace fs = std::filesystem;

constexpr char const* DOCUMENT_KEY = "document";
constexpr char const* ERROR_KEY = "error";
constexpr char const* EXTRACT_PRESET_KEY = "extract_preset";
constexpr char const* PACK_PRESET_KEY = "pack_preset";
constexpr char const* LETTERS_KEY = "letters";
constexpr char const* PAGES_KEY = "pages";
constexpr char const* FIELDS_KEY = "fields";
constexpr char const* READY_KEY = "production_ready";
constexpr char const* MESSAGE_KEY = "message";
constexpr char const* MISSING_KEY = "missing";
constexpr char const* WARNINGS_KEY = "warnings";
constexpr char const* DIFFERING_KEY = "differing_pages";
constexpr char const* NOT_SEPARATED_KEY = "not_separated";
constexpr char const* FINDINGS_KEY = "findings";
constexpr char const* PAGE_KEY = "page";
constexpr char const* SAYS_KEY = "says";
constexpr char const* PRIMARY_ADDRESS_KEY = "primary_address";
constexpr char const* TRACE_KEY = "trace";

json::Value nameOrNull(Cfg::ExtractedField const* field) {
    return field ? json::Value(field->name()) : json::Value(json_null());
}

void setUnlessEmpty(json::Object& object, char const* key, std::vector<std::string> const& texts) {
    if (texts.empty())
        return;
    json::Array array;
    for (std::string const& text : texts)
        array.append(text);
    object.set(key, array);
}

std::vector<std::string> textsOf(json::Value const& array) {
    std::vector<std::string> texts;
    if (array)
        for (json::Value const& text : array.toArray())
            texts.push_back(text.toString());
    return texts;
}

json::Array toJson(std::vector<Reader::DoubtfulJoin> const& joins) {
    json::Array array;
    for (Reader::DoubtfulJoin const& join : joins)
        array.append(json::Object{{PAGE_KEY, join.page}, {SAYS_KEY, join.says}});
    return array;
}

std::vector<Reader::DoubtfulJoin> joinsIn(json::Value const& array) {
    std::vector<Reader::DoubtfulJoin> joins;
    if (array)
        for (json::Value const& join : array.toArray())
            joins.push_back({static_cast<int>(join.toObject().get(PAGE_KEY).toInt()),
                             join.toObject().get(SAYS_KEY).toString()});
    return joins;
}

json::Array toJson(std::vector<Production::Finding> const& findings) {
    json::Array array;
    for (Production::Finding const& finding : findings)
        array.append(finding.toJson());
    return array;
}

std::vector<Production::Finding> findingsIn(json::Value const& array) {
    std::vector<Production::Finding> findings;
    if (array)
        for (json::Value const& finding : array.toArray())
            findings.push_back(Production::Finding::fromJson(finding.toObject()));
    return findings;
}

json::Object toJson(LetterReading const& letter) {
    std::string message;
    bool const ready = letter.isProductionReady(message);
    json::Object object{{PAGES_KEY, toJsonArray(letter.pages)},
                        {FIELDS_KEY, letter.fields.serialize()},
                        {READY_KEY, ready},
                        {MESSAGE_KEY, message},
                        {PRIMARY_ADDRESS_KEY, nameOrNull(letter.fields.primaryAddressField())}};
    if (!letter.differingPages.empty())
        object.set(DIFFERING_KEY, toJsonArray(letter.differingPages));
    if (!letter.doubtfulJoins.empty())
        object.set(NOT_SEPARATED_KEY, toJson(letter.doubtfulJoins));
    if (!letter.findings.empty())
        object.set(FINDINGS_KEY, toJson(letter.findings));
    setUnlessEmpty(object, MISSING_KEY, letter.missing);
    setUnlessEmpty(object, WARNINGS_KEY, letter.warnings);
    return object;
}

json::Value lettersToJson(std::vector<LetterReading> const& letters) {
    json::Array array;
    for (LetterReading const& letter : letters)
        array.append(toJson(letter));
    return array;
}

std::vector<int> numbersIn(json::Value const& array) {
    std::vector<int> numbers;
    for (json::Value const& number : array.toArray())
        numbers.push_back(static_cast<int>(number.toInt()));
    return numbers;
}

LetterReading letterFrom(json::Object const& object) {
    LetterReading letter{numbersIn(object.get(PAGES_KEY)),
                         Cfg::ExtractedFields(object.get(FIELDS_KEY).toArray()),
                         textsOf(object.get(MISSING_KEY)),
                         {},
                         textsOf(object.get(WARNINGS_KEY))};
    if (json::Value const differing = object.get(DIFFERING_KEY))
        letter.differingPages = numbersIn(differing);
    letter.doubtfulJoins = joinsIn(object.get(NOT_SEPARATED_KEY));
    letter.findings = findingsIn(object.get(FINDINGS_KEY));
    return letter;
}

/// The library takes a field with a bad pattern for one that was not found; here it is said instead.
void requirePattern(std::string const& pattern, std::string const& whose, NodeSettings const& settings) {
    try {
        Cfg::ExtractPreset::match(pattern, std::string());
    } catch (std::exception const& bad) {
        throw Base::Error("the pattern " + Base::inQuotes(pattern) + " of " + whose +
                          " cannot be used: " + bad.what() + "; correct it in " + settings.place());
    }
}

void requirePatterns(Cfg::ExtractPreset const& preset, NodeSettings const& settings) {
    for (Cfg::ExtractZone const& zone : preset.zones()) {
        for (Cfg::ExtractField const& field : zone.fields()) {
            std::string const whose = "field " + Base::inQuotes(field.name()) + " in zone " +
                                      Base::inQuotes(zone.name()) + " of the preset for " +
                                      Base::inQuotes(preset.strRegex());
            requirePattern(field.strRegex(), whose, settings);
            requirePattern(field.validation().strRegex(), whose, settings);
        }
    }
}

std::pair<Cfg::ExtractPreset const&, Cfg::PackPreset const&>
findPresets(std::string const& name, PresetIndex const& presets, NodeSettings const& settings) {
    try {
        return presets.findMatch(name);
    } catch (std::exception const& failure) {
        throw Base::Error(std::string(failure.what()) + "; correct the presets in " + settings.place());
    }
}

std::vector<LetterReading> lettersOf(Reader::Document& document, Cfg::ExtractPreset const& preset,
                                     Cfg::PackPreset const& packPreset, Reader::Trace* trace) {
    std::vector<LetterReading> letters;
    Reader::ReadingRules const rules = Reader::ReadingRules::of(packPreset);
    for (Reader::Letter& letter : Reader::readLetters(document, preset, trace, rules))
        letters.push_back({std::move(letter.pages),
                           std::move(letter.fields),
                           std::move(letter.missing),
                           {},
                           std::move(letter.warnings),
                           {},
                           std::move(letter.doubtfulJoins)});
    return letters;
}

/// A person has decided that the pages belong together.
void acceptJoins(std::vector<LetterReading>& letters) {
    for (LetterReading& letter : letters) {
        for (Reader::DoubtfulJoin const& join : letter.doubtfulJoins)
            letter.warnings.push_back("pages: page " + std::to_string(join.page) +
                                      " was accepted as part of this letter, although " + join.says);
        letter.doubtfulJoins.clear();
    }
}

/// Writes the pages of letters that can go out.
class PageWriting {
public:
    PageWriting(Reader::Document& document, std::size_t checkEvery)
        : document_(document), checkEvery_(checkEvery) {}

    void addBlobs(LetterReading& letter) {
        if (!letter.whyNot().empty())
            return;
        for (int const page : letter.pages) {
            std::string const pdf = document_.singlePagePdf(page);
            if (written_++ % checkEvery_ == 0 && !document_.showsTheSame(page, pdf))
                letter.differingPages.push_back(page);
            letter.blobs.push_back({page, Mailing::compressed(pdf)});
        }
        if (!letter.differingPages.empty())
            letter.blobs.clear();
    }

private:
    Reader::Document& document_;
    std::size_t checkEvery_;
    std::size_t written_ = 0;
};

void addBlobs(std::vector<LetterReading>& letters, Reader::Document& document, std::size_t checkEvery) {
    PageWriting writing(document, checkEvery);
    for (LetterReading& letter : letters)
        writing.addBlobs(letter);
}

void readLetters(ReadResult& result, Reader::Document& document, PresetIndex const& presets,
                 NodeSettings const& settings, Along const& along, std::size_t place) {
    DocumentReading& reading = result.reading;
    auto const& [extractPreset, packPreset] = findPresets(reading.document, presets, settings);
    reading.extractPreset = extractPreset.strRegex();
    reading.packPreset = packPreset.name();
    if (extractPreset.isForAttachemnt())
        return;
    requirePatterns(extractPreset, settings);
    Reader::Trace trace;
    bool const isTraced = along.afterReading || along.checks == Along::Checks::Yes;
    reading.letters = lettersOf(document, extractPreset, packPreset, isTraced ? &trace : nullptr);
    if (along.joins == Along::Joins::Accept)
        acceptJoins(*reading.letters);
    if (along.checks == Along::Checks::Yes)
        checkLetters(*reading.letters, {document, extractPreset, trace, place}, packPreset, settings);
    if (along.afterReading)
        along.afterReading(result, {document, extractPreset, trace, place});
    if (along.pages == Along::Pages::Yes)
        addBlobs(*reading.letters, document, along.checkEvery);
}

void fail(ReadResult& result, std::exception const& failure) {
    result.reading.document = Base::validUtf8(result.reading.document);
    result.reading.error = Base::validUtf8(failure.what());
    result.reading.letters.reset();
    result.report.clear();
}

/// "pages 1-2 and pages 3-4 may be two letters", "pages 1-6 may be 3 letters, from pages 1, 3, 5 on".
std::string partsInWords(LetterReading const& letter) {
    constexpr std::size_t MOST = 20;
    std::vector<int> const& pages = letter.pages;
    if (letter.doubtfulJoins.size() == 1) {
        auto const second = std::find(pages.begin(), pages.end(), letter.doubtfulJoins.front().page);
        return pagesInWords({pages.begin(), second}) + " and " + pagesInWords({second, pages.end()}) +
               " may be two letters";
    }
    std::vector<int> begins{pages.front()};
    for (Reader::DoubtfulJoin const& join : letter.doubtfulJoins)
        if (begins.size() < MOST)
            begins.push_back(join.page);
    bool const areAll = begins.size() > letter.doubtfulJoins.size();
    return pagesInWords(pages) + " may be " + std::to_string(letter.doubtfulJoins.size() + 1) +
           " letters, from " + pagesInWords(begins) + (areAll ? "" : " and so") + " on";
}

/// All evidence is in JSON.
std::string joinsInWords(LetterReading const& letter) {
    Reader::DoubtfulJoin const& first = letter.doubtfulJoins.front();
    return "letter-not-separated: " + partsInWords(letter) + ": on page " + std::to_string(first.page) + ' ' +
           first.says + "; correct the mark or the document, or mail them as one letter with --accept-joined";
}

} // namespace

json::Array toJsonArray(std::vector<int> const& numbers) {
    json::Array array;
    for (int const number : numbers)
        array.append(number);
    return array;
}

std::string LetterReading::whyNot() const {
    if (!differingPages.empty())
        return "page-differs: " + pagesInWords(differingPages) +
               " would not look like the document's; print it to a new PDF";
    if (!doubtfulJoins.empty())
        return joinsInWords(*this);
    std::string message;
    if (isProductionReady(message))
        return errorsInWords(findings);
    if (message.empty())
        return "no address to go to";
    return message;
}

json::Object DocumentReading::toJson() const {
    json::Object object{{DOCUMENT_KEY, document}};
    if (failed()) {
        object.set(ERROR_KEY, error);
    } else {
        object.set(EXTRACT_PRESET_KEY, extractPreset);
        object.set(PACK_PRESET_KEY, packPreset);
        object.set(LETTERS_KEY, letters ? lettersToJson(*letters) : json::Value(json_null()));
    }
    if (trace)
        object.set(TRACE_KEY, trace);
    return object;
}

DocumentReading DocumentReading::fromJson(json::Object const& object) {
    DocumentReading reading;
    reading.document = object.get(DOCUMENT_KEY).toString();
    reading.error = object.get(ERROR_KEY).textOrEmpty();
    reading.trace = object.get(TRACE_KEY);
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

ReadResult readDocument(fs::path const& file, PresetIndex const& presets, NodeSettings const& settings,
                        Along const& along, std::size_t place) {
    ReadResult result;
    result.reading.document = file.filename().string();
    try {
        if (along.beforeReading)
            along.beforeReading(result, presets.presets());
        std::string bytes = Base::readFile(file);
        if (along.digest == Along::Digest::Yes)
            result.sha256 = Base::sha256(bytes);
        Reader::Document document = Reader::openDocument(std::move(bytes), file);
        readLetters(result, document, presets, settings, along, place);
    } catch (std::exception const& failure) {
        fail(result, failure);
    }
    return result;
}

ReadResult splitDocument(DecidedDocument decided, std::size_t checkEvery) {
    ReadResult result{std::move(decided.reading)};
    if (!result.reading.letters)
        return result;
    try {
        std::string bytes = Base::readFile(decided.file);
        result.sha256 = Base::sha256(bytes);
        if (result.sha256 != decided.sha256)
            throw Base::Error('"' + decided.file.string() + "\" has changed; make the plan again");
        Reader::Document document = Reader::openDocument(std::move(bytes), decided.file);
        addBlobs(*result.reading.letters, document, checkEvery);
    } catch (std::exception const& failure) {
        fail(result, failure);
    }
    return result;
}

} // namespace VlMail
