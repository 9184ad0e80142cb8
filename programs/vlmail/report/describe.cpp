#include "programs/vlmail/report/describe.h"

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

Sheet sheetOf(int number, Reader::Document& document) {
    Reader::Page const& page = document.page(number);
    Sheet sheet{number, page.width, page.height};
    try {
        sheet.png = document.renderPage(number, DOTS_PER_INCH);
    } catch (std::bad_alloc const&) {
        // That says nothing of the page.
        throw;
    } catch (std::exception const& failure) {
        sheet.whyNoPicture = failure.what();
    }
    return sheet;
}

/// The place of the page among the sheets, to which it is added when it is not there yet.
std::size_t placeAmong(std::vector<Sheet>& sheets, int page, Reader::Document& document) {
    auto const place =
        static_cast<std::size_t>(std::ranges::find(sheets, page, &Sheet::page) - sheets.begin());
    if (place == sheets.size())
        sheets.push_back(sheetOf(page, document));
    return place;
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

Fault faultOf(Production::Finding const& finding, Letter& letter, Reader::Document& document) {
    Fault fault{nameOf(finding.code), finding.isError(),
                finding.pages.empty() ? "document" : pagesInWords(finding.pages), finding.says, finding.fix};
    fault.box = finding.box;
    if (finding.box == Box())
        return fault;
    for (int const page : finding.pages)
        if (std::ranges::find(letter.sheets, page, &Sheet::page) != letter.sheets.end() ||
            letter.sheets.size() < MOST_SHEETS)
            fault.sheets.push_back(placeAmong(letter.sheets, page, document));
    return fault;
}

Letter letterOf(LetterReading const& reading, Reader::Document& document, Reader::PageTrace const& trace) {
    Letter letter{pagesInWords(reading.pages), reading.whyNot(), {sheetOf(trace.page, document)}};
    for (ZoneTrace const& seen : trace.zones) {
        int const page = seen.place.page == 0 ? trace.page : seen.place.page;
        letter.zones.push_back(zoneOf(seen, reading, document.page(page)));
        letter.zones.back().sheet = placeAmong(letter.sheets, page, document);
    }
    for (Production::Finding const& finding : reading.findings)
        letter.faults.push_back(faultOf(finding, letter, document));
    return letter;
}

} // namespace

Document describe(DocumentReading const& reading) {
    Document described{reading.document, reading.error, reading.extractPreset, reading.packPreset};
    described.isAttachment = reading.isAttachment();
    return described;
}

Document describe(DocumentReading const& reading, Reader::Document& document, Reader::Trace const& trace) {
    Document described = describe(reading);
    auto letter = reading.letters->begin();
    for (Reader::PageTrace const& page : trace.pages) {
        if (page.beginsLetter)
            described.letters.push_back(letterOf(*letter++, document, page));
    }
    return described;
}

} // namespace VlMail::Report
