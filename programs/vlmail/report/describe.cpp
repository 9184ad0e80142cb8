#include "programs/vlmail/report/describe.h"

#include "programs/base/error.h"
#include "programs/base/utf8.h"
#include "programs/vlmail/letters/field_words.h"
#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/presets/words.h"

#include <algorithm>
#include <new>
#include <string>

namespace VlMail::Report {
namespace {

using Reader::Box;
using Reader::FieldTrace;
using Reader::ZoneTrace;
using State = Field::State;

/// Text can be read, and a page is some 100 KB.
constexpr double DOTS_PER_INCH = 110;
/// What lies where can be seen, and a side is some 10 KB.
constexpr double SMALL_DOTS_PER_INCH = 36;

State stateOf(FieldTrace const& field) {
    if (!field.value)
        return field.definition->mustHave() ? State::Missing : State::NotFound;
    if (!field.counts)
        return State::Unused;
    if (field.value->valueType() == Cfg::ExtractedField::ValueType::Invalid)
        return State::Invalid;
    return field.isFound() ? State::Found : State::Default;
}

void addNote(std::string& notes, std::string const& note) {
    if (note.empty())
        return;
    notes += (notes.empty() ? "" : "; ") + note;
}

std::string noteOf(FieldTrace const& field, State state, Cfg::ExtractedField const* primary) {
    std::string notes;
    if (field.value && state != State::Unused)
        addNote(notes, roleInWords(*field.value, primary && primary->name() == field.value->name()));
    if (state == State::Unused)
        addNote(notes, "another field of this name counts");
    if (state == State::Missing)
        addNote(notes, "it is obligatory");
    if (field.joined)
        addNote(notes, field.joined->joint == Reader::Joint::Right ? "joined with the line to the right"
                                                                   : "joined with the line below");
    if (field.isTooWide)
        addNote(notes, "the match is " + inMillimetres(field.match->width) + " mm wide, allowed are " +
                           inMillimetres(field.definition->maxWidth()) + " mm");
    return notes;
}

bool isFree(Box const& space, Reader::Page const& page) {
    return space.left >= 0 && space.right <= page.width &&
           std::none_of(page.words.begin(), page.words.end(), [&](Reader::Word const& word) {
               return word.box.left < space.right && space.left < word.box.right &&
                      word.box.top < space.bottom && space.top < word.box.bottom;
           });
}

/// Where the name hides the least text. Its width on the page is a guess: browsers choose the font.
Field::Tag tagFor(Box const& match, std::string const& name, Reader::Page const& page) {
    int const width = 300 + 200 * static_cast<int>(name.size());
    if (isFree({match.right, match.top, match.right + width, match.bottom}, page))
        return Field::Tag::Behind;
    if (isFree({match.left - width, match.top, match.left, match.bottom}, page))
        return Field::Tag::InFront;
    return Field::Tag::Above;
}

Field fieldOf(FieldTrace const& trace, Cfg::ExtractedField const* primary, Reader::Page const& page) {
    Field field{trace.definition->name()};
    field.state = stateOf(trace);
    field.note = noteOf(trace, field.state, primary);
    if (trace.value)
        field.value = trace.value->valueToStr();
    if (trace.match) {
        field.match = trace.joined ? trace.joined->parts : std::vector{trace.match->box};
        field.tag = tagFor(field.match.front(), field.name, page);
    }
    return field;
}

Box boxOf(ZoneTrace const& zone) {
    if (zone.place.location)
        return *zone.place.location;
    if (!zone.blocks.empty())
        return zone.box;
    Cfg::Point const point = zone.place.point;
    return {point.x, point.y, point.x, point.y};
}

Sheet sheetOf(LetterReading const& letter, int number, ShownPages& pages) {
    Production::PageSize const size = pages.size(number);
    Sheet sheet{number, size.width, size.height};
    try {
        sheet.png = pages.picture(letter, number, DOTS_PER_INCH);
    } catch (std::bad_alloc const&) {
        // That says nothing of the page.
        throw;
    } catch (std::exception const& failure) {
        sheet.whyNoPicture = failure.what();
    }
    return sheet;
}

/// The place of the page among the sheets, to which it is added when it is not there yet.
std::size_t placeAmong(std::vector<Sheet>& sheets, int page, LetterReading const& letter, ShownPages& pages) {
    auto const place =
        static_cast<std::size_t>(std::ranges::find(sheets, page, &Sheet::page) - sheets.begin());
    if (place == sheets.size())
        sheets.push_back(sheetOf(letter, page, pages));
    return place;
}

/// What was found on a page lies elsewhere on the sheet that it is turned for.
void turn(Zone& zone, Production::PageSize page, int quarterTurns) {
    zone.box = turned(zone.box, page, quarterTurns);
    for (Field& field : zone.fields)
        for (Box& box : field.match)
            box = turned(box, page, quarterTurns);
}

std::vector<Side> sidesOf(LetterReading const& letter, ShownPages& pages) {
    try {
        std::vector<Side> sides = pages.sides(letter);
        for (Side& side : sides)
            side.png = pages.picture(letter, side, SMALL_DOTS_PER_INCH);
        return sides;
    } catch (Base::Error const&) {
        // What keeps the letter from being made ready is said beside it.
        return {};
    }
}

Zone zoneOf(ZoneTrace const& seen, LetterReading const& letter, Reader::Page const& page) {
    Zone zone{seen.definition->name(), boxOf(seen), seen.definition->hasAddress(),
              !seen.definition->hasLocation()};
    zone.whyNowhere = seen.place.whyNowhere;
    for (FieldTrace const& field : seen.fields)
        zone.fields.push_back(fieldOf(field, letter.fields.primaryAddressField(), page));
    return zone;
}

/// Each picture makes the report longer, and one of a kind shows what is wrong.
constexpr std::size_t MOST_SHEETS = 20;

Fault faultOf(Production::Finding const& finding, Letter& letter, LetterReading const& reading,
              ShownPages& pages) {
    Fault fault{nameOf(finding.code), finding.isError(),
                finding.pages.empty() ? "document" : pagesInWords(finding.pages), finding.says, finding.fix};
    if (finding.box == Box() || finding.pages.empty())
        return fault;
    // Pages of one finding are of one form.
    int const first = finding.pages.front();
    fault.box = turned(finding.box, pages.document().pageSize(first), pages.quarterTurns(first));
    for (int const page : finding.pages)
        if (std::ranges::find(letter.sheets, page, &Sheet::page) != letter.sheets.end() ||
            letter.sheets.size() < MOST_SHEETS)
            fault.sheets.push_back(placeAmong(letter.sheets, page, reading, pages));
    return fault;
}

/// A page that may begin another letter: what makes it look like that is drawn on it.
Fault faultOf(Reader::DoubtfulJoin const& join, Letter& letter, LetterReading const& reading,
              ShownPages& pages) {
    Fault fault{"letter-not-separated", true, pagesInWords({join.page}),
                "may begin another letter: " + join.says,
                "correct the mark or the document, or mail them as one letter with --accept-joined"};
    if (join.box == Box())
        return fault;
    fault.box = turned(join.box, pages.document().pageSize(join.page), pages.quarterTurns(join.page));
    if (std::ranges::find(letter.sheets, join.page, &Sheet::page) != letter.sheets.end() ||
        letter.sheets.size() < MOST_SHEETS)
        fault.sheets.push_back(placeAmong(letter.sheets, join.page, reading, pages));
    return fault;
}

Letter letterOf(LetterReading const& reading, ShownPages& pages, Reader::PageTrace const& trace) {
    Letter letter{pagesInWords(reading.pages), reading.whyNot(), {sheetOf(reading, trace.page, pages)}};
    for (ZoneTrace const& seen : trace.zones) {
        int const page = seen.place.page == 0 ? trace.page : seen.place.page;
        Reader::Page const& read = pages.document().page(page);
        letter.zones.push_back(zoneOf(seen, reading, read));
        turn(letter.zones.back(), read.size(), pages.quarterTurns(page));
        letter.zones.back().sheet = placeAmong(letter.sheets, page, reading, pages);
    }
    for (Reader::DoubtfulJoin const& join : reading.doubtfulJoins)
        letter.faults.push_back(faultOf(join, letter, reading, pages));
    for (Production::Finding const& finding : reading.findings)
        letter.faults.push_back(faultOf(finding, letter, reading, pages));
    letter.sides = sidesOf(reading, pages);
    return letter;
}

} // namespace

Document describe(DocumentReading const& reading) {
    Document described{reading.document, reading.error, reading.extractPreset, reading.packPreset};
    described.isAttachment = reading.isAttachment();
    return described;
}

Document describe(DocumentReading const& reading, ShownPages& pages, Reader::Trace const& trace) {
    Document described = describe(reading);
    auto letter = reading.letters->begin();
    for (Reader::PageTrace const& page : trace.pages) {
        if (page.beginsLetter)
            described.letters.push_back(letterOf(*letter++, pages, page));
    }
    return described;
}

} // namespace VlMail::Report
