#include "programs/reader/mark_sighting.h"

#include "programs/base/log_capture.h"
#include "programs/base/millimetres.h"
#include "programs/patterns/parts.h"
#include "programs/patterns/text_forms.h"
#include "programs/reader/field_search.h"
#include "programs/reader/letters.h"

#include "vlservice/extract/extract_zone.h"

#include <algorithm>
#include <limits>
#include <string_view>
#include <utility>

namespace Reader {
namespace {

using Cfg::ExtractField;
using Nearness = MarkSighting::Nearness;

constexpr char const* OTHER_CASE = "with another letter case";
constexpr char const* LOOK_ALIKES = "with characters that look alike";
constexpr char const* OTHER_BLANKS = "with other blanks";
constexpr char const* OTHER_WAYS = "written in another way";

/// A mark this far outside of its zone was meant to be in it, in 1/100 mm.
constexpr int BEYOND = 2000;
constexpr std::size_t MIN_LABEL_CHARACTERS = 4;

/// A match in some writing of a text: the lines that it takes, counted from 0.
struct LineHit {
    std::size_t first = 0;
    std::size_t count = 0;
    std::string value;
};

std::size_t lineBreaksIn(std::string_view text) {
    return static_cast<std::size_t>(std::count(text.begin(), text.end(), '\n'));
}

std::optional<LineHit> find(ExtractField const& field, std::string text) {
    std::optional<LineHit> hit;
    auto const remember = [&hit](std::string& all, unsigned long long offset, unsigned long long length) {
        std::string_view const whole = all;
        hit = LineHit{
            lineBreaksIn(whole.substr(0, offset)), lineBreaksIn(whole.substr(offset, length)) + 1, {}};
        return 0ULL;
    };
    auto const value = field.extractField(text, remember, [](std::string const&) {});
    if (!hit || !value || value->isValidated())
        return std::nullopt;
    hit->value = comparable(value->rawValue().textOrEmpty());
    return hit;
}

Stretch linesOf(ZoneText const& text, LineHit const& hit) {
    std::string const& all = text.text();
    std::size_t begin = 0;
    for (std::size_t line = 0; line < hit.first; ++line)
        begin = all.find('\n', begin) + 1;
    std::size_t end = begin;
    for (std::size_t line = 0; line < hit.count; ++line)
        end = std::min(all.find('\n', end), all.size()) + 1;
    return text.stretch(begin, end - 1 - begin);
}

/// Whether there are words in the label.
bool isTelling(std::string const& label) {
    std::size_t characters = 0;
    for (std::string const& literal : Patterns::literalsOf(label))
        characters += literal.size();
    return characters >= MIN_LABEL_CHARACTERS;
}

Box grown(Box const& at) {
    auto const moved = [](int edge, long long by) {
        return static_cast<int>(std::clamp<long long>(edge + by, std::numeric_limits<int>::min(),
                                                      std::numeric_limits<int>::max()));
    };
    return {moved(at.left, -BEYOND), moved(at.top, -BEYOND), moved(at.right, BEYOND),
            moved(at.bottom, BEYOND)};
}

/// How far the box reaches out of the location where it does most.
int reach(Box const& box, Box const& location) {
    return std::max({location.left - box.left, location.top - box.top, box.right - location.right,
                     box.bottom - location.bottom, 0});
}

ExtractField withPattern(ExtractField const& field, std::string pattern) {
    ExtractField variant(field);
    variant.setRegex(std::move(pattern));
    return variant;
}

MarkSighting sighting(Nearness nearness, LineHit hit, ZoneText const& text, std::string difference) {
    Stretch lines = linesOf(text, hit);
    return {0, nearness, std::move(hit.value), std::move(lines.text), lines.box, std::move(difference)};
}

} // namespace

std::string comparable(std::string_view text) {
    std::string folded = Patterns::foldedCase(Patterns::withPlainMarks(text));
    std::erase_if(folded, [](char c) { return c == ' ' || c == '\n'; });
    return folded;
}

MarkWatch::MarkWatch(Cfg::ExtractPreset const& preset, ReadingRules const& rules) {
    for (Cfg::ExtractZone const& zone : preset.zones())
        for (ExtractField const& field : zone.fields())
            if (separatesLetters(field) && !field.strRegex().empty() && rules.isOnFirstPage(zone.name()))
                marks_.push_back(markOf(zone, rules.forZone(zone.name()), field));
}

MarkWatch::Mark MarkWatch::markOf(Cfg::ExtractZone const& zone, ZoneRules const* rules,
                                  ExtractField const& field) {
    std::string const& pattern = field.strRegex();
    std::string const plain = Patterns::withPlainMarks(pattern);
    std::string const loose = "(?i)" + Patterns::withAnyBlanks(plain);
    Mark mark{&zone,
              rules ? *rules : ZoneRules(),
              &field,
              {withPattern(field, loose), true, OTHER_WAYS},
              {{withPattern(field, "(?i)" + pattern), false, OTHER_CASE},
               {withPattern(field, plain), true, LOOK_ALIKES},
               {withPattern(field, Patterns::withAnyBlanks(pattern)), false, OTHER_BLANKS}},
              {}};
    if (std::string const label = Patterns::labelIn(loose); isTelling(label))
        mark.label = Reading{withPattern(field, Patterns::withWholeAsValue(label)), true, ""};
    return mark;
}

std::vector<MarkSighting> MarkWatch::found(PageTrace const& trace) const {
    std::vector<MarkSighting> sightings;
    for (ZoneTrace const& zone : trace.zones)
        for (FieldTrace const& field : zone.fields)
            for (std::size_t i = 0; i < marks_.size(); ++i)
                if (marks_[i].field == field.definition && field.isFound() && field.match)
                    sightings.push_back({i, Nearness::Found, comparable(*field.rawText), field.match->text,
                                         field.match->box});
    return sightings;
}

std::vector<MarkSighting> MarkWatch::nearly(Page const& page, Layout const& layout, PatternTime& time) const {
    // A failing pattern is told of where its field is searched.
    Base::LogCapture const quiet;
    std::vector<MarkSighting> sightings;
    for (std::size_t i = 0; i < marks_.size() && !time.isUp(); ++i) {
        PatternTime::Turn const turn(time);
        if (auto near = nearly(marks_[i], page, layout)) {
            near->mark = i;
            sightings.push_back(std::move(*near));
        }
    }
    return sightings;
}

std::optional<MarkSighting> MarkWatch::nearly(Mark const& mark, Page const& page,
                                              Layout const& layout) const {
    ZoneView const view = viewOf(page, layout, *mark.zone, mark.rules);
    ZoneText const& text = view.text;
    auto const foundBy = [](Reading const& reading, ZoneText const& in) {
        return find(reading.field, reading.isOfPlainText ? Patterns::withPlainMarks(in.text()) : in.text());
    };
    if (auto hit = foundBy(mark.loose, text)) {
        auto const single = std::find_if(mark.single.begin(), mark.single.end(), [&](Reading const& reading) {
            return foundBy(reading, text).has_value();
        });
        return sighting(Nearness::Nearly, std::move(*hit), text,
                        single == mark.single.end() ? OTHER_WAYS : single->difference);
    }
    bool const liesSomewhere = view.place.location && view.place.whyNowhere.empty();
    if (liesSomewhere && !mark.field->strRegex().starts_with("\\A")) {
        Box const& location = *view.place.location;
        ZoneText const wider = ZoneText::inside(page, layout, grown(location), view.place.order);
        if (auto hit = foundBy(mark.loose, wider)) {
            MarkSighting beyond = sighting(Nearness::Nearly, std::move(*hit), wider, {});
            beyond.difference = Base::withMillimetres(reach(beyond.box, location)) + " beyond the zone \"" +
                                mark.zone->name() + '"';
            return beyond;
        }
    }
    if (!mark.label)
        return std::nullopt;
    auto hit = foundBy(*mark.label, text);
    if (!hit)
        return std::nullopt;
    hit->value.clear();
    return sighting(Nearness::Label, std::move(*hit), text, "with another value than its pattern takes");
}

} // namespace Reader
