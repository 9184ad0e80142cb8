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
    Cfg::Rect const& location = zone.definition->location();
    if (zone.definition->hasLocation())
        return {location.left, location.top, location.right, location.bottom};
    if (!zone.blocks.empty())
        return zone.box;
    Cfg::Point const point = zone.definition->mostProbablePoint();
    return {point.x, point.y, point.x, point.y};
}

std::vector<Zone> zonesOf(Reader::PageTrace const& trace, LetterReading const& letter,
                          Reader::Page const& page) {
    std::vector<Zone> zones;
    for (ZoneTrace const& seen : trace.zones) {
        Zone zone{seen.definition->name(), boxOf(seen), seen.definition->hasAddress(),
                  !seen.definition->hasLocation()};
        for (FieldTrace const& field : seen.fields)
            zone.fields.push_back(fieldOf(field, letter.fields.primaryAddressField(), page));
        zones.push_back(std::move(zone));
    }
    return zones;
}

void draw(Letter& letter, Reader::Document& document) {
    try {
        letter.png = document.renderPage(letter.page, DOTS_PER_INCH);
    } catch (std::bad_alloc const&) {
        // That says nothing of the page.
        throw;
    } catch (std::exception const& failure) {
        letter.whyNoPicture = failure.what();
    }
}

Letter letterOf(LetterReading const& reading, Reader::Document& document, Reader::PageTrace const& trace) {
    Letter letter{trace.page, pagesInWords(reading.pages), reading.whyNot()};
    Reader::Page const& page = document.page(trace.page);
    letter.width = page.width;
    letter.height = page.height;
    draw(letter, document);
    letter.zones = zonesOf(trace, reading, page);
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
