#include "programs/vlmail/letters/reading.h"

#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/base/json_rows.h"
#include "programs/base/quoting.h"
#include "programs/base/read_file.h"
#include "programs/base/utf8.h"
#include "programs/mailing/metadata.h"
#include "programs/mailing/page_blob.h"
#include "programs/policy/limits.h"
#include "programs/production/colour.h"
#include "programs/production/cover_page.h"
#include "programs/production/letter_digest.h"
#include "programs/production/maker.h"
#include "programs/reader/document.h"
#include "programs/reader/letters.h"
#include "programs/reader/page_pictures.h"
#include "programs/vlmail/letters/checking.h"
#include "programs/vlmail/letters/making_ready.h"
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
constexpr char const* CODE_KEY = "code";
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
constexpr char const* COVER_PAGE_KEY = "cover_page";
constexpr char const* PAGE_KEY = "page";
constexpr char const* SAYS_KEY = "says";
constexpr char const* PRIMARY_ADDRESS_KEY = "primary_address";
constexpr char const* TRACE_KEY = "trace";

// Why a letter cannot go out, beside the codes of findings and of what settings do not allow.
constexpr char const* PAGE_DIFFERS = "page-differs";
constexpr char const* LETTER_NOT_SEPARATED = "letter-not-separated";

json::Value nameOrNull(Cfg::ExtractedField const* field) {
    return field ? json::Value(field->name()) : json::Value(json_null());
}

/// The empty handle for a list without elements, which is not written.
json::Value unlessEmpty(json::Array const& array) {
    return array.empty() ? json::Value() : json::Value(array);
}

json::Array toJson(std::vector<std::string> const& texts) {
    json::Array array;
    for (std::string const& text : texts)
        array.append(text);
    return array;
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

std::vector<int> numbersIn(json::Value const& array) {
    std::vector<int> numbers;
    for (json::Value const& number : array.toArray())
        numbers.push_back(static_cast<int>(number.toInt()));
    return numbers;
}

std::string messageOf(LetterReading const& letter) {
    std::string message;
    letter.isProductionReady(message);
    return message;
}

bool isReady(LetterReading const& letter) {
    std::string message;
    return letter.isProductionReady(message);
}

namespace Schema = Base::Schema;
using Base::Presence;
using LetterRow = Base::JsonRow<LetterReading>;

json::Object joinsSchema() {
    using Schema::Members;
    return Schema::listOf(Members(Members::Others::Refused)
                              .require(PAGE_KEY, Schema::integer(1))
                              .require(SAYS_KEY, Schema::text())
                              .schema());
}

constexpr LetterRow LETTER_ROWS[] = {
    {PAGES_KEY, Presence::Always, [] { return Schema::listOf(Schema::integer(1)); },
     [](LetterReading const& letter) -> json::Value { return toJsonArray(letter.pages); },
     [](json::Value const& node, LetterReading& letter) { letter.pages = numbersIn(node); }},
    {FIELDS_KEY, Presence::Always,
     [] { return Schema::listOf(Schema::definition(Mailing::EXTRACTED_FIELD)); },
     [](LetterReading const& letter) -> json::Value { return letter.fields.serialize(); },
     [](json::Value const& node, LetterReading& letter) {
         letter.fields = Cfg::ExtractedFields(node.toArray());
     }},
    {READY_KEY, Presence::Always, &Schema::flag,
     [](LetterReading const& letter) -> json::Value { return isReady(letter); }},
    {MESSAGE_KEY, Presence::Always, &Schema::text,
     [](LetterReading const& letter) -> json::Value { return messageOf(letter); }},
    {PRIMARY_ADDRESS_KEY, Presence::Always, [] { return Schema::orNull(Schema::text()); },
     [](LetterReading const& letter) { return nameOrNull(letter.fields.primaryAddressField()); }},
    {DIFFERING_KEY, Presence::WhenThere, [] { return Schema::listOf(Schema::integer(1)); },
     [](LetterReading const& letter) { return unlessEmpty(toJsonArray(letter.differingPages)); },
     [](json::Value const& node, LetterReading& letter) {
         if (node)
             letter.differingPages = numbersIn(node);
     }},
    {NOT_SEPARATED_KEY, Presence::WhenThere, &joinsSchema,
     [](LetterReading const& letter) { return unlessEmpty(toJson(letter.doubtfulJoins)); },
     [](json::Value const& node, LetterReading& letter) { letter.doubtfulJoins = joinsIn(node); }},
    {FINDINGS_KEY, Presence::WhenThere, [] { return Schema::listOf(Production::Finding::schema()); },
     [](LetterReading const& letter) { return unlessEmpty(toJson(letter.findings)); },
     [](json::Value const& node, LetterReading& letter) { letter.findings = findingsIn(node); }},
    {COVER_PAGE_KEY, Presence::WhenThere, &Schema::text,
     [](LetterReading const& letter) {
         return letter.coverAddress.empty() ? json::Value() : json::Value(letter.coverAddress);
     },
     [](json::Value const& node, LetterReading& letter) { letter.coverAddress = node.textOrEmpty(); }},
    {MISSING_KEY, Presence::WhenThere, [] { return Schema::listOf(Schema::text()); },
     [](LetterReading const& letter) { return unlessEmpty(toJson(letter.missing)); },
     [](json::Value const& node, LetterReading& letter) { letter.missing = textsOf(node); }},
    {WARNINGS_KEY, Presence::WhenThere, [] { return Schema::listOf(Schema::text()); },
     [](LetterReading const& letter) { return unlessEmpty(toJson(letter.warnings)); },
     [](json::Value const& node, LetterReading& letter) { letter.warnings = textsOf(node); }},
};

json::Object toJson(LetterReading const& letter) {
    json::Object object;
    Base::writeRows<LetterReading>(LETTER_ROWS, letter, object);
    return object;
}

LetterReading letterFrom(json::Object const& object) {
    LetterReading letter;
    Base::readRows<LetterReading>(LETTER_ROWS, object, letter);
    return letter;
}

json::Value lettersToJson(std::vector<LetterReading> const& letters) {
    json::Array array;
    for (LetterReading const& letter : letters)
        array.append(toJson(letter));
    return array;
}

using DocumentRow = Base::JsonRow<DocumentReading>;

/// A document that could not be read has its error and none of the others.
json::Value unlessFailed(DocumentReading const& reading, json::Value value) {
    return reading.failed() ? json::Value() : std::move(value);
}

json::Value lettersOrNull(DocumentReading const& reading) {
    return reading.letters ? lettersToJson(*reading.letters) : json::Value(json_null());
}

void readLettersFrom(json::Value const& node, DocumentReading& reading) {
    if (reading.failed() || !node.isArray())
        return;
    reading.letters.emplace();
    for (json::Value const& letter : node.toArray())
        reading.letters->push_back(letterFrom(letter.toObject()));
}

constexpr DocumentRow DOCUMENT_ROWS[] = {
    {DOCUMENT_KEY, Presence::Always, &Schema::text,
     [](DocumentReading const& reading) -> json::Value { return reading.document; },
     [](json::Value const& node, DocumentReading& reading) { reading.document = node.toString(); }},
    {ERROR_KEY, Presence::WhenThere, &Schema::text,
     [](DocumentReading const& reading) {
         return reading.failed() ? json::Value(reading.error) : json::Value();
     },
     [](json::Value const& node, DocumentReading& reading) { reading.error = node.textOrEmpty(); }},
    {CODE_KEY, Presence::WhenThere, &Schema::text,
     [](DocumentReading const& reading) {
         return reading.failed() ? json::Value(Base::nameOf(reading.code)) : json::Value();
     },
     [](json::Value const& node, DocumentReading& reading) {
         reading.code = Base::codeNamed(node.textOrEmpty()).value_or(Base::Code::Unexpected);
     }},
    {EXTRACT_PRESET_KEY, Presence::WhenThere, &Schema::text,
     [](DocumentReading const& reading) { return unlessFailed(reading, reading.extractPreset); },
     [](json::Value const& node, DocumentReading& reading) {
         if (!reading.failed())
             reading.extractPreset = node.toString();
     }},
    {PACK_PRESET_KEY, Presence::WhenThere, &Schema::text,
     [](DocumentReading const& reading) { return unlessFailed(reading, reading.packPreset); },
     [](json::Value const& node, DocumentReading& reading) {
         if (!reading.failed())
             reading.packPreset = node.toString();
     }},
    {LETTERS_KEY, Presence::WhenThere,
     [] { return Schema::orNull(Schema::listOf(Schema::definition(LETTER_DEFINITION))); },
     [](DocumentReading const& reading) { return unlessFailed(reading, lettersOrNull(reading)); },
     &readLettersFrom},
    {TRACE_KEY, Presence::WhenThere, &Schema::anything,
     [](DocumentReading const& reading) { return reading.trace; },
     [](json::Value const& node, DocumentReading& reading) { reading.trace = node; }},
};

/// The library takes a field with a bad pattern for one that was not found; here it is said instead.
void requirePattern(std::string const& pattern, std::string const& whose, NodeSettings const& settings) {
    try {
        Cfg::ExtractPreset::match(pattern, std::string());
    } catch (std::exception const& bad) {
        throw Base::Error(Base::Code::PatternInvalid, "the pattern " + Base::inQuotes(pattern) + " of " +
                                                          whose + " cannot be used: " + bad.what() +
                                                          "; correct it in " + settings.place());
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
        throw Base::Error(Base::Code::PresetMissing,
                          std::string(failure.what()) + "; correct the presets in " + settings.place());
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

std::vector<Production::PageSize> sizesOf(std::vector<int> const& pages, Reader::Document& document) {
    std::vector<Production::PageSize> sizes;
    for (int const number : pages)
        sizes.push_back(document.pageSize(number));
    return sizes;
}

void addTo(LetterReading& letter, std::string const& whyNotMade) {
    if (!whyNotMade.empty())
        letter.findings.insert(letter.findings.begin(), Production::findingOf(whyNotMade));
    if (letter.findings.size() > Production::Findings::MOST)
        letter.findings.pop_back();
}

/// Errors stand first.
void addWarning(LetterReading& letter, Production::Finding finding) {
    if (letter.findings.size() < Production::Findings::MOST)
        letter.findings.push_back(std::move(finding));
}

/// Looking at the page may have told already.
void noteWrittenAnew(LetterReading& letter, int page) {
    auto const told = std::ranges::find_if(letter.findings, [](Production::Finding const& finding) {
        return finding.code == Production::Code::PageRedrawn && !finding.pages.empty();
    });
    if (told == letter.findings.end())
        return addWarning(letter, Production::redrawnFinding({page}));
    auto const place = std::ranges::lower_bound(told->pages, page);
    if (place == told->pages.end() || *place != page)
        told->pages.insert(place, page);
}

/// Notes which of the letters cannot be made ready. Pages that cannot be read have no size, and are told
/// already.
void holdAgainst(std::vector<LetterReading>& letters, Reader::Document& document,
                 Cfg::PackPreset const& preset, MakingReady& making) {
    std::vector<Production::Finding> const warnings = making.warningsFor(preset);
    for (LetterReading& letter : letters) {
        if (std::ranges::find(letter.findings, Production::Code::PageUnreadable,
                              &Production::Finding::code) == letter.findings.end())
            addTo(letter, making.whyNot(preset, sizesOf(letter.pages, document)));
        for (Production::Finding const& warning : warnings)
            addWarning(letter, warning);
    }
}

/// Of the letter by itself, with what goes out along with it.
long long sheetsOf(LetterReading const& letter, Cfg::PackPreset const& preset, MakingReady const* making) {
    std::vector<int> parts{static_cast<int>(letter.pages.size())};
    if (!letter.coverAddress.empty())
        parts.push_back(1);
    if (making)
        for (MadeAttachment const& attachment : making->attachmentsOf(preset.name()))
            parts.push_back(static_cast<int>(attachment.pages.size()));
    return Production::sheetsOf(parts, preset.duplex() ? Production::Sides::Both : Production::Sides::One);
}

void holdAgainstLimits(std::vector<LetterReading>& letters, Cfg::PackPreset const& preset,
                       NodeSettings const& settings, MakingReady const* making) {
    for (LetterReading& letter : letters)
        if (auto const refusal = Policy::refusalOfSheets(sheetsOf(letter, preset, making), settings.rules()))
            letter.findings.insert(letter.findings.begin(),
                                   {Production::Code::TooManySheets,
                                    Production::Severity::Error,
                                    {},
                                    {},
                                    refusal->says,
                                    "send it as several letters, or raise \"max_letter_sheets\" there"});
}

/// Makes the pages of letters that can go out.
class PageMaking {
public:
    /// Without `making` pages stay as they are.
    PageMaking(Reader::Document& document, Cfg::PackPreset const& preset, Along const& along)
        : document_(document), along_(along), rules_(rulesOf(preset)),
          maker_(along.making ? &along.making->makerFor(preset) : nullptr),
          countsColours_(along.making && along.making->countsColours(preset)) {}

    void addBlobs(LetterReading& letter) {
        if (!letter.whyNot().empty())
            return;
        try {
            addCover(letter);
            Production::LetterDigest digest(letter.fields);
            for (int const page : letter.pages)
                addPage(letter, page, digest);
            if (along_.pages == Along::Pages::Yes)
                letter.digest = digest.text();
        } catch (Unmade const& failure) {
            addTo(letter, Production::DOCUMENT_DAMAGED + Base::validUtf8(failure.what()));
        }
        if (!letter.whyNot().empty()) {
            letter.cover.clear();
            letter.blobs.clear();
        }
    }

private:
    using Kind = Production::Part::Kind;
    /// Of one page; the document's others may be fine.
    struct Unmade : Base::Error {
        using Base::Error::Error;
    };

    void addCover(LetterReading& letter) {
        if (letter.coverAddress.empty())
            return;
        try {
            PageBlob& blob = letter.cover.emplace_back();
            blob.size = rules_.sheet;
            if (along_.pages == Along::Pages::Yes)
                blob.data = Mailing::compressed(Production::coverPage(letter.coverAddress, rules_));
        } catch (Base::Error const& failure) {
            throw Unmade(Base::Code::DocumentUnreadable, failure.what());
        }
    }

    void addPage(LetterReading& letter, int number, Production::LetterDigest& digest) {
        Production::PreparedPage const content = contentOf(number);
        if (document_.isWrittenAnew(number))
            noteWrittenAnew(letter, number);
        if (along_.pages == Along::Pages::Yes) {
            hold(content.pdf, letter, number);
            describe(digest, number, content.pdf);
        }
        int const place = static_cast<int>(letter.blobs.size()) + 1;
        PageBlob& blob = letter.blobs.emplace_back();
        blob.number = number;
        Production::PreparedPage const made = this->made(content, Kind::FirstLetter, place);
        blob.size = made.size;
        blob.isColoured = blob.isLaterColoured = made.isColoured;
        if (along_.pages == Along::Pages::Yes)
            blob.data = Mailing::compressed(made.pdf);
        if (maker_ && maker_->tellsFirstLetters())
            addLater(blob, this->made(content, Kind::LaterLetter, place), made);
    }

    Production::PreparedPage contentOf(int number) {
        Production::PreparedPage content{{}, document_.pageSize(number)};
        if (along_.pages == Along::Pages::Yes || countsColours_)
            content.pdf = document_.singlePagePdf(number);
        content.isColoured = countsColours_ && Production::hasColour(document_, number, content.pdf);
        return content;
    }

    /// Before anything is laid on it: what lies on all letters tells none from another.
    void describe(Production::LetterDigest& digest, int number, std::string const& pdf) {
        Reader::Page const& page = document_.page(number);
        digest.add(page, page.isTyped ? std::vector<std::string>()
                                      : Reader::pictureDigests(pdf, page.words.empty()));
    }

    /// What is written is held against the document before anything is laid on it.
    void hold(std::string const& pdf, LetterReading& letter, int number) {
        if (written_++ % along_.checkEvery == 0 && !document_.showsTheSame(number, pdf))
            letter.differingPages.push_back(number);
    }

    Production::PreparedPage made(Production::PreparedPage const& content, Kind kind, int place) {
        if (!maker_)
            return content;
        try {
            return along_.pages == Along::Pages::Yes ? maker_->make(content, {kind}, place)
                                                     : maker_->plan(content, {kind}, place);
        } catch (Base::Error const& failure) {
            throw Unmade(Base::Code::DocumentUnreadable, failure.what());
        }
    }

    void addLater(PageBlob& blob, Production::PreparedPage const& later,
                  Production::PreparedPage const& first) {
        blob.isLaterColoured = later.isColoured;
        if (later.pdf != first.pdf)
            blob.laterData = Mailing::compressed(later.pdf);
    }

    /// What is wrong with them keeps letters from going out before.
    static Production::ProductionRules rulesOf(Cfg::PackPreset const& preset) {
        std::vector<Reader::RulesFault> faults;
        return Production::ProductionRules::of(preset, faults);
    }

    Reader::Document& document_;
    Along const& along_;
    Production::ProductionRules const rules_;
    Production::Maker* maker_;
    bool countsColours_;
    std::size_t written_ = 0;
};

void addBlobs(std::vector<LetterReading>& letters, Reader::Document& document, Cfg::PackPreset const& preset,
              Along const& along) {
    if (along.pages == Along::Pages::No)
        return;
    PageMaking making(document, preset, along);
    for (LetterReading& letter : letters)
        making.addBlobs(letter);
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
        checkLetters(*reading.letters, {document, extractPreset, packPreset, trace, place}, packPreset,
                     settings);
    if (along.making)
        holdAgainst(*reading.letters, document, packPreset, *along.making);
    if (along.limits == Along::Limits::Yes)
        holdAgainstLimits(*reading.letters, packPreset, settings, along.making);
    if (along.afterReading)
        along.afterReading(result, {document, extractPreset, packPreset, trace, place});
    addBlobs(*reading.letters, document, packPreset, along);
}

void fail(ReadResult& result, std::exception const& failure) {
    result.reading.document = Base::validUtf8(result.reading.document);
    result.reading.error = Base::validUtf8(failure.what());
    result.reading.code = Base::codeOf(failure);
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
    return std::string(LETTER_NOT_SEPARATED) + ": " + partsInWords(letter) + ": on page " +
           std::to_string(first.page) + ' ' + first.says +
           "; correct the mark or the document, or mail them as one letter with --accept-joined";
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
        return std::string(PAGE_DIFFERS) + ": " + pagesInWords(differingPages) +
               " would not look like the document's; print it to a new PDF";
    if (!doubtfulJoins.empty())
        return joinsInWords(*this);
    std::string message;
    if (!isProductionReady(message))
        return message.empty() ? "no address to go to" : message;
    std::string const faults = errorsInWords(findings);
    return faults.empty() ? refusal : faults;
}

std::string LetterReading::codeOfWhyNot() const {
    if (!differingPages.empty())
        return PAGE_DIFFERS;
    if (!doubtfulJoins.empty())
        return LETTER_NOT_SEPARATED;
    if (!isReady(*this))
        return {};
    // Errors stand first.
    if (!findings.empty() && findings.front().isError())
        return nameOf(findings.front().code);
    return refusal.substr(0, refusal.find(':'));
}

json::Object DocumentReading::toJson() const {
    json::Object object;
    Base::writeRows<DocumentReading>(DOCUMENT_ROWS, *this, object);
    return object;
}

DocumentReading DocumentReading::fromJson(json::Object const& object) {
    DocumentReading reading;
    Base::readRows<DocumentReading>(DOCUMENT_ROWS, object, reading);
    return reading;
}

void DocumentReading::describe(Base::Schema::Members& into) {
    Base::describeRows<DocumentReading>(DOCUMENT_ROWS, into);
}

json::Object letterSchema() { return Base::schemaOf<LetterReading>(LETTER_ROWS); }

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

ReadResult readDocument(Reader::Document& document, PresetIndex const& presets, NodeSettings const& settings,
                        Along const& along) {
    ReadResult result;
    result.reading.document = document.name();
    try {
        if (along.beforeReading)
            along.beforeReading(result, presets.presets());
        readLetters(result, document, presets, settings, along, 1);
    } catch (std::exception const& failure) {
        fail(result, failure);
    }
    return result;
}

ReadResult splitDocument(DecidedDocument decided, Cfg::Presets const& presets, std::size_t checkEvery,
                         MakingReady& making) {
    ReadResult result{std::move(decided.reading)};
    if (!result.reading.letters)
        return result;
    try {
        std::string bytes = Base::readFile(decided.file);
        result.sha256 = Base::sha256(bytes);
        if (result.sha256 != decided.sha256)
            throw Base::Error(Base::Code::DocumentChanged,
                              '"' + decided.file.string() + "\" has changed; make the plan again");
        Reader::Document document = Reader::openDocument(std::move(bytes), decided.file);
        // Without such a preset there is no mailing, which is said where it would begin.
        if (Cfg::PackPreset const* const preset = packPresetNamed(result.reading.packPreset, presets))
            addBlobs(*result.reading.letters, document, *preset,
                     {.pages = Along::Pages::Yes, .checkEvery = checkEvery, .making = &making});
    } catch (std::exception const& failure) {
        fail(result, failure);
    }
    return result;
}

} // namespace VlMail
