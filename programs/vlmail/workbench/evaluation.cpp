#include "programs/vlmail/workbench/evaluation.h"

#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/base/utf8.h"
#include "programs/vlmail/explain/explain.h"
#include "programs/vlmail/explain/refusal.h"
#include "programs/vlmail/report/describe.h"
#include "programs/vlmail/report/printed_pages.h"
#include "programs/vlmail/report/report_file.h"
#include "programs/vlmail/report/shapes.h"
#include "programs/vlmail/workbench/changes.h"
#include "programs/vlmail/workbench/printed_picture.h"
#include "programs/vlmail/workbench/verdict.h"

#include <algorithm>
#include <array>
#include <functional>
#include <optional>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

namespace VlMail::Workbench {
namespace {

using Reader::Box;
using Report::Field;
using Report::Letter;
using Report::Shape;
using Report::Sheet;

/// Pages as reports have them; their pictures come one by one.
class PagesWithoutPictures : public Report::ShownPages {
public:
    /// What goes out with letters is known where they are made ready.
    PagesWithoutPictures(Report::PrintedPages& pages, bool areMadeReady)
        : pages_(pages), areMadeReady_(areMadeReady) {}

    Reader::Document& document() const override { return pages_.document(); }
    int quarterTurns(int page) const override { return pages_.quarterTurns(page); }
    Production::PageSize size(int page) const override { return pages_.size(page); }
    std::string picture(LetterReading const&, int, double) override { return {}; }
    std::string picture(LetterReading const&, Report::Side const&, double) override { return {}; }
    std::vector<Report::Side> sides(LetterReading const& letter) override {
        return areMadeReady_ ? pages_.sides(letter) : std::vector<Report::Side>();
    }
    bool areMadeReady() const { return areMadeReady_; }

private:
    Report::PrintedPages& pages_;
    bool const areMadeReady_;
};

/// The digits that a page's mark is told in: enough to tell states of one document.
constexpr std::size_t MARK_DIGITS = 16;

/// In the order of Field::State.
constexpr std::array STATES{"found", "default", "unused", "not_found", "invalid", "missing"};

json::Value null() { return json::Value(json_null()); }

json::Value orNull(std::optional<std::size_t> number) {
    return number ? json::Value(static_cast<long long>(*number)) : null();
}

json::Value orNull(json::Value value) { return value ? std::move(value) : null(); }

json::Array toJson(std::vector<Reader::Box> const& boxes) {
    json::Array array;
    for (Reader::Box const& box : boxes)
        array.append(Workbench::toJson(box));
    return array;
}

json::Object toJson(Shape const& shape) {
    return {{"look", shape.look},
            {"box", Workbench::toJson(shape.box)},
            {"tag", shape.tag.value_or("")},
            {"label", shape.label},
            {"zone", orNull(shape.zone)},
            {"field", orNull(shape.field)},
            {"finding", orNull(shape.fault)}};
}

json::Array sheetsOf(Letter const& letter) {
    json::Array sheets;
    for (std::size_t i = 0; i < letter.sheets.size(); ++i) {
        json::Array shapes;
        for (Shape const& shape : shapesOn(letter, i))
            shapes.append(toJson(shape));
        Sheet const& sheet = letter.sheets[i];
        sheets.append(json::Object{
            {"page", sheet.page}, {"width", sheet.width}, {"height", sheet.height}, {"shapes", shapes}});
    }
    return sheets;
}

json::Array sidesOf(Letter const& letter) {
    json::Array sides;
    for (Report::Side const& side : letter.sides)
        sides.append(Workbench::toJson(side));
    return sides;
}

json::Array findingsOf(Letter const& letter) {
    json::Array findings;
    for (Report::Fault const& fault : letter.faults) {
        json::Array sheets;
        for (std::size_t const sheet : fault.sheets)
            sheets.append(static_cast<long long>(sheet));
        findings.append(json::Object{{"code", fault.code},
                                     {"error", fault.isError},
                                     {"pages", fault.pages},
                                     {"says", fault.says},
                                     {"fix", fault.fix},
                                     {"sheets", sheets},
                                     {"box", fault.sheets.empty() ? null() : Workbench::toJson(fault.box)}});
    }
    return findings;
}

/// Where the zone lies on its page as it was read, as settings tell it.
Box asRead(Report::Zone const& zone, Letter const& letter, Report::ShownPages const& pages) {
    constexpr int WHOLE = 4;
    Sheet const& sheet = letter.sheets[zone.sheet];
    int const back = (WHOLE - pages.quarterTurns(sheet.page)) % WHOLE;
    return Report::turned(zone.box, {sheet.width, sheet.height}, back);
}

/// Those that are printed otherwise, {"page": quarters clockwise}.
json::Object turnedPages(Report::ShownPages const& pages) {
    json::Object turned;
    for (int page = 1; page <= pages.document().pageCount(); ++page)
        if (int const quarters = pages.quarterTurns(page); quarters != 0)
            turned.set(std::to_string(page), quarters);
    return turned;
}

/// Another one when the pages would be printed otherwise.
std::string markOf(OpenDocument const& read, std::vector<LetterReading> const& letters,
                   MakingReady const& making) {
    std::ostringstream all;
    all << read.packPreset.serialize(false);
    for (LetterReading const& letter : letters)
        all << toJsonArray(letter.pages) << letter.coverAddress;
    for (UsedDocument const& used : making.usedDocuments())
        all << used.id << used.sha256;
    return Base::sha256(std::move(all).str()).substr(0, MARK_DIGITS);
}

/// The letters of one document, with what its explanation says of them and where the settings have them.
class Teller {
public:
    Teller(SettingsInWork& settings, Cfg::ExtractPreset const& preset, std::string const& packPreset)
        : settings_(settings), preset_(preset), listed_(settings.listed(preset)),
          pack_(settings.listedPack(packPreset)) {}

    /// `page` is that of the letter in the trace, `explained` in the explanation.
    json::Object tell(Letter const& letter, LetterReading const& reading, Reader::PageTrace const& page,
                      json::Object const& explained, PagesWithoutPictures const& pages) {
        json::Array zones;
        json::Array const traced = explained.get(Explanation::ZONES).toArray();
        for (std::size_t i = 0; i < letter.zones.size(); ++i) {
            Report::Zone const& one = letter.zones[i];
            zones.append(zone(one, asRead(one, letter, pages), page.zones[i], traced.at(i).toObject()));
        }
        return {{"pages", toJsonArray(reading.pages)},
                {"pages_in_words", letter.pages},
                {"why_not", letter.whyNot},
                {"sheets", sheetsOf(letter)},
                {"sides", pages.areMadeReady() ? json::Value(sidesOf(letter)) : null()},
                {"zones", zones},
                {"findings", findingsOf(letter)}};
    }

    /// A letter as the texts of its zones.
    json::Object tell(LetterReading const& letter) const {
        json::Array zones;
        for (Cfg::ExtractZone const& zone : preset_.zones())
            zones.append(givenZone(zone, letter));
        return {{"pages", json::Array()},   {"pages_in_words", ""}, {"why_not", letter.whyNot()},
                {"sheets", json::Array()},  {"sides", null()},      {"zones", zones},
                {"findings", json::Array()}};
    }

    json::Object presetToJson() const {
        return {{"name", preset_.name()}, {"match", preset_.strRegex()}, {"pointer", pointerOf(listed_)}};
    }
    json::Value packPointer() const { return pointerOf(pack_); }

private:
    json::Object zone(Report::Zone const& zone, Box const& box, Reader::ZoneTrace const& trace,
                      json::Object const& explained) {
        ListedZone const* const listed = settings_.listed(listed_, preset_, *trace.definition);
        json::Array fields;
        json::Array const traced = explained.get(Explanation::FIELDS).toArray();
        for (std::size_t i = 0; i < zone.fields.size(); ++i)
            fields.append(field(zone.fields[i], *trace.definition, *trace.fields[i].definition, listed,
                                traced.at(i).toObject()));
        return {{"name", zone.name},
                {"sheet", static_cast<long long>(zone.sheet)},
                {"box", Workbench::toJson(box)},
                {"address_window", zone.isAddressWindow},
                {"by_point", zone.isByPoint},
                {"nowhere", zone.whyNowhere},
                {"pointer", pointerOf(listed)},
                {"location_pointer", listed ? json::Value((listed->place / "location").pointer()) : null()},
                {"anchor", orNull(explained.get(Explanation::ANCHOR))},
                {"text", explained.get(Explanation::TEXT)},
                {"text_box", orNull(explained.get(Explanation::BOX))},
                {"fields", fields}};
    }

    json::Object givenZone(Cfg::ExtractZone const& zone, LetterReading const& letter) const {
        ListedZone const* const listed = settings_.listed(listed_, preset_, zone);
        json::Array fields;
        for (Cfg::ExtractField const& definition : zone.fields())
            fields.append(givenField(definition, settings_.listed(listed, zone, definition), letter));
        return {{"name", zone.name()},
                {"sheet", 0},
                {"box", Workbench::toJson(Box())},
                {"address_window", false},
                {"by_point", false},
                {"nowhere", "its text is given"},
                {"pointer", pointerOf(listed)},
                {"location_pointer", null()},
                {"anchor", null()},
                {"text", ""},
                {"text_box", null()},
                {"fields", fields}};
    }

    static json::Object givenField(Cfg::ExtractField const& definition, ListedField const* listed,
                                   LetterReading const& letter) {
        auto const [state, value] = stateIn(letter, definition.name());
        return {{"name", definition.name()},
                {"value", value},
                {"state", STATES.at(static_cast<std::size_t>(state))},
                {"note", ""},
                {"says", ""},
                {"pattern", definition.strRegex()},
                {"type", typeInWords(definition)},
                {"obligatory", definition.mustHave()},
                {"match", json::Array()},
                {"raw", null()},
                {"pointer", pointerOf(listed)},
                {"near_misses", json::Array()}};
    }

    static std::pair<Field::State, std::string> stateIn(LetterReading const& letter,
                                                        std::string const& name) {
        for (auto const& [priority, field] : letter.fields)
            if (field.name() == name)
                return {field.isValid() ? Field::State::Found : Field::State::Invalid,
                        Base::validUtf8(field.valueToStr())};
        bool const isMissing = std::ranges::find(letter.missing, name) != letter.missing.end();
        return {isMissing ? Field::State::Missing : Field::State::NotFound, ""};
    }

    json::Object field(Field const& field, Cfg::ExtractZone const& zone, Cfg::ExtractField const& definition,
                       ListedZone const* listedZone, json::Object const& explained) {
        ListedField const* const listed = settings_.listed(listedZone, zone, definition);
        return {{"name", field.name},
                {"value", field.value},
                {"state", STATES.at(static_cast<std::size_t>(field.state))},
                {"note", field.note},
                {"says", explained.get(Explanation::SAYS).textOrEmpty()},
                {"pattern", definition.strRegex()},
                {"type", explained.get(Explanation::TYPE)},
                {"obligatory", explained.get(Explanation::OBLIGATORY)},
                {"match", toJson(field.match)},
                {"raw", orNull(explained.get(Explanation::RAW))},
                {"pointer", pointerOf(listed)},
                {"near_misses", nearMisses(explained, listedZone, listed)}};
    }

    json::Array nearMisses(json::Object const& field, ListedZone const* zone, ListedField const* listed) {
        json::Array told;
        json::Value const misses = field.get(Explanation::NEAR_MISSES);
        ChangePlaces const places{listed_, pack_, zone, listed};
        for (std::size_t i = 0; misses && i < misses.toArray().size(); ++i) {
            json::Object const miss = misses.toArray().at(i).toObject();
            ProposedEdits const edits = editsFor(settings_.text(), places, miss.get(Explanation::CHANGE));
            told.append(json::Object{{"kind", miss.get(Explanation::KIND)},
                                     {"says", miss.get(Explanation::SAYS)},
                                     {"text", orNull(miss.get(Explanation::TEXT))},
                                     {"page", orNull(miss.get(Explanation::PAGE))},
                                     {"box", orNull(miss.get(Explanation::BOX))},
                                     {"edits", edits ? json::Value(Workbench::toJson(edits->edits)) : null()},
                                     {"change", edits ? json::Value(edits->says) : null()}});
        }
        return told;
    }

    SettingsInWork& settings_;
    Cfg::ExtractPreset const& preset_;
    ListedExtractPreset const* listed_;
    ListedPackPreset const* pack_;
};

void addLetters(json::Object& answer, DocumentReading const& reading, OpenDocument const& read,
                json::Object const& explanation, SettingsInWork& settings, MakingReady* making) {
    MakingReady none;
    Report::PrintedPages printed(read.document, read.packPreset, making ? *making : none);
    PagesWithoutPictures pages(printed, making != nullptr);
    Report::Document const described = Report::describe(reading, pages, read.trace);
    Teller teller(settings, read.preset, read.packPreset.name());
    json::Array letters;
    json::Array const explained = explanation.get(Explanation::PAGES).toArray();
    for (std::size_t i = 0, next = 0; i < read.trace.pages.size(); ++i) {
        if (!read.trace.pages[i].beginsLetter)
            continue;
        letters.append(teller.tell(described.letters[next], (*reading.letters)[next], read.trace.pages[i],
                                   explained.at(i).toObject(), pages));
        ++next;
    }
    answer.set("extract_preset", teller.presetToJson());
    answer.set("pack_preset",
               json::Object{{"name", read.packPreset.name()}, {"pointer", teller.packPointer()}});
    answer.set("letters", letters);
    answer.set("turned", turnedPages(pages));
    if (making)
        answer.set("printed", markOf(read, *reading.letters, *making));
}

/// Which presets were tried; the last of them is the one that answered.
void addPresets(json::Object& answer, DocumentReading const& reading, SettingsInWork& settings) {
    if (reading.trace)
        answer.set("presets_tried", reading.trace.toObject().get(Explanation::PRESETS));
    if (reading.failed() || answer.get("extract_preset"))
        return;
    // An attachment: nothing was searched in it.
    auto const [preset, pack] = settings.presets().findMatch(reading.document);
    Teller const teller(settings, preset, pack.name());
    answer.set("extract_preset", teller.presetToJson());
    answer.set("pack_preset", json::Object{{"name", pack.name()}, {"pointer", teller.packPointer()}});
}

json::Value errorOf(DocumentReading const& reading) {
    if (!reading.failed())
        return null();
    return json::Object{{"code", Base::nameOf(reading.code)}, {"line", reading.error}};
}

void addVerdict(json::Object& answer, DocumentReading const& reading, int pageCount) {
    answer.set("page_count", pageCount);
    answer.set("verdict", verdictWord(reading));
    answer.set("says", Report::stateOf(reading));
    answer.set("error", errorOf(reading));
}

} // namespace

json::Object toJson(Reader::Box const& box) {
    return {{"left", box.left}, {"top", box.top}, {"right", box.right}, {"bottom", box.bottom}};
}

void addEvaluation(json::Object& answer, Reader::Document& document, SettingsInWork& settings,
                   MakingReady* making) {
    Along along;
    along.making = making;
    along.checks = making ? Along::Checks::Yes : Along::Checks::No;
    along.limits = Along::Limits::Yes;
    along.beforeReading = [](ReadResult& result, Cfg::Presets const& presets) {
        result.reading.trace = explainPresets(presets, result.reading.document);
    };
    along.afterReading = [&](ReadResult& result, OpenDocument const& read) {
        json::Object explanation = result.reading.trace.toObject();
        explainPages(explanation, read.document, read.preset, Reader::ReadingRules::of(read.packPreset),
                     read.trace);
        addLetters(answer, result.reading, read, explanation, settings, making);
    };
    DocumentReading const reading =
        readDocument(document, settings.presets(), settings.node(), along).reading;
    addVerdict(answer, reading, document.pageCount());
    addPresets(answer, reading, settings);
}

void addReading(json::Object& answer, DocumentReading const& reading, SettingsInWork& settings) {
    addVerdict(answer, reading, 0);
    auto const [preset, pack] = settings.presets().findMatch(reading.document);
    Teller const teller(settings, preset, pack.name());
    json::Array letters;
    for (LetterReading const& letter : *reading.letters)
        letters.append(teller.tell(letter));
    answer.set("extract_preset", teller.presetToJson());
    answer.set("pack_preset", json::Object{{"name", pack.name()}, {"pointer", teller.packPointer()}});
    answer.set("letters", letters);
}

} // namespace VlMail::Workbench
