#include "programs/vlmail/explain/explain.h"

#include "programs/vlmail/explain/near_miss.h"
#include "programs/vlmail/explain/preset_walk.h"
#include "programs/vlmail/explain/read_pages.h"
#include "programs/vlmail/explain/refusal.h"
#include "programs/vlmail/explain/words.h"

#include <algorithm>
#include <cstdlib>

namespace VlMail {

using namespace Explanation;
using Reader::Box;
using Reader::FieldTrace;
using Reader::PageTrace;
using Reader::ZoneTrace;

namespace {

char const* nameOf(PresetStep::Answer answer) {
    switch (answer) {
    case PresetStep::Answer::Yes:
        return ANSWER_YES;
    case PresetStep::Answer::No:
        return ANSWER_NO;
    case PresetStep::Answer::Failed:
        break;
    }
    return ANSWER_FAILED;
}

json::Object toJson(PresetStep const& step) {
    return {{MATCH, step.preset->strRegex()},
            {NAME, step.preset->name()},
            {PACK_PRESET, step.preset->packPresetName()},
            {INHERITED, step.isInherited},
            {ANSWER, nameOf(step.answer)},
            {WHY, step.why}};
}

json::Object toJson(Box const& box) {
    return {{"left", box.left}, {"top", box.top}, {"right", box.right}, {"bottom", box.bottom}};
}

json::Object toJson(Reader::Stretch const& stretch) {
    return {{TEXT, stretch.text}, {BOX, toJson(stretch.box)}, {WIDTH, stretch.width}};
}

json::Array toJson(std::vector<Box> const& boxes) {
    json::Array array;
    for (Box const& box : boxes)
        array.append(toJson(box));
    return array;
}

json::Object toJson(Reader::JoinedMatch const& joined) {
    return {{JOINT, joined.joint == Reader::Joint::Right ? JOINT_RIGHT : JOINT_BELOW},
            {PARTS, toJson(joined.parts)}};
}

json::Object toJson(NearMiss const& miss) {
    json::Object object{{KIND, VlMail::nameOf(miss.kind)}, {SAYS, miss.says}};
    if (miss.change)
        object.set(CHANGE, miss.change);
    if (miss.page == 0)
        return object;
    object.set(TEXT, miss.text);
    object.set(PAGE, miss.page);
    object.set(BOX, toJson(miss.box));
    return object;
}

char const* outcomeOf(FieldTrace const& trace) {
    if (trace.definition->strRegex().empty())
        return OUTCOME_NOT_SEARCHED;
    if (trace.isTooWide)
        return OUTCOME_TOO_WIDE;
    if (!trace.rawText)
        return OUTCOME_NOT_FOUND;
    return trace.value->isValid() ? OUTCOME_FOUND : OUTCOME_INVALID;
}

/// What width limit and validator say against the match; empty when they take it.
std::string objection(FieldTrace const& trace, Reader::PatternTime& time) {
    if (trace.isTooWide)
        return "wider than " + Words::millimetres(static_cast<long long>(trace.definition->maxWidth())) +
               ": " + Words::millimetres(trace.match->width);
    if (!trace.rawText || trace.value->isValid())
        return {};
    Reader::PatternTime::Turn const turn(time);
    std::optional<Refusal> const refusal = refusalOf(*trace.definition, *trace.rawText);
    return refusal ? refusal->says : std::string();
}

/// The letter has a valid value of this name that was read on the page.
bool isFoundOn(PageTrace const& page, std::string const& name) {
    FieldTrace const* const counting = page.counting(name);
    return counting && counting->isFound() && counting->value->isValid();
}

class PageExplainer {
public:
    PageExplainer(PageTrace const& trace, std::vector<int> otherPages, Cfg::ExtractPreset const& preset,
                  Reader::ReadingRules const& rules, ReadPages& pages, Reader::PatternTime& time)
        : trace_(trace), otherPages_(std::move(otherPages)), preset_(preset), rules_(rules), pages_(pages),
          time_(time) {}

    json::Object explain() const {
        json::Array zones;
        for (ZoneTrace const& zone : trace_.zones)
            zones.append(explain(zone));
        json::Object object{{PAGE, trace_.page}, {BEGINS_LETTER, trace_.beginsLetter}, {ZONES, zones}};
        if (trace_.doubtfulJoin)
            object.set(MAY_BEGIN_LETTER, json::Object{{SAYS, trace_.doubtfulJoin->says},
                                                      {BOX, toJson(trace_.doubtfulJoin->box)}});
        if (LaidOutPage const* const page = pages_.page(trace_.page)) {
            object.set(WIDTH, page->page->width);
            object.set(HEIGHT, page->page->height);
        }
        return object;
    }

private:
    json::Object explain(ZoneTrace const& trace) const {
        Cfg::ExtractZone const& zone = *trace.definition;
        json::Object object{{NAME, zone.name()}};
        if (zone.hasLocation())
            object.set(LOCATION, zone.location().serialize());
        else
            object.set(POINT, zone.mostProbablePoint().serialize());
        addPlace(object, trace.place);
        object.set(TEXT, trace.text);
        if (!trace.blocks.empty())
            object.set(BOX, toJson(trace.box));
        object.set(BLOCKS, toJson(trace.blocks));
        json::Array fields;
        for (FieldTrace const& field : trace.fields)
            fields.append(explain(trace, field));
        object.set(FIELDS, fields);
        return object;
    }

    /// What "reading" says of the zone's place.
    void addPlace(json::Object& object, Reader::ZonePlace const& place) const {
        if (place.page != 0 && place.page != trace_.page)
            object.set(PAGE, place.page);
        if (!place.whyNowhere.empty())
            object.set(NOWHERE, place.whyNowhere);
        if (place.anchor) {
            object.set(ANCHOR, toJson(*place.anchor));
            object.set(PLACE, place.location
                                  ? toJson(*place.location)
                                  : toJson({place.point.x, place.point.y, place.point.x, place.point.y}));
        }
        if (place.order == Reader::ReadingOrder::Columns)
            object.set(BY_COLUMN, true);
    }

    json::Object explain(ZoneTrace const& zone, FieldTrace const& trace) const {
        Cfg::ExtractField const& field = *trace.definition;
        json::Object object{{NAME, field.name()},         {OUTCOME, outcomeOf(trace)},
                            {PATTERN, field.strRegex()},  {TYPE, typeInWords(field)},
                            {PRIORITY, field.priority()}, {OBLIGATORY, field.mustHave()}};
        if (trace.match)
            object.set(MATCH, toJson(*trace.match));
        if (trace.joined)
            object.set(JOINED, toJson(*trace.joined));
        if (!trace.sendersLine.empty())
            object.set(SENDERS_LINE, trace.sendersLine);
        if (!trace.cut.empty())
            object.set(CUT, trace.cut);
        if (trace.rawText)
            object.set(RAW, *trace.rawText);
        std::string const says = objection(trace, time_);
        if (!says.empty())
            object.set(SAYS, says);
        if (trace.value)
            addValue(object, trace);
        addNearMisses(object, zone, trace);
        return object;
    }

    void addValue(json::Object& object, FieldTrace const& trace) const {
        object.set(IS_DEFAULT, !trace.rawText);
        object.set(VALUE, trace.value->rawValue());
        object.set(SHOWN, trace.value->valueToStr());
        object.set(IS_PASSED_OVER, trace_.beginsLetter && !trace.counts);
    }

    void addNearMisses(json::Object& object, ZoneTrace const& zone, FieldTrace const& trace) const {
        if (!trace_.beginsLetter || isFoundOn(trace_, trace.definition->name()))
            return;
        json::Array misses;
        MissedField const missed{preset_, rules_, zone, trace, trace_.page, otherPagesThan(zone.place.page)};
        for (NearMiss const& miss : nearMissesOf(missed, pages_, time_))
            misses.append(toJson(miss));
        if (!misses.empty())
            object.set(NEAR_MISSES, misses);
    }

    std::vector<int> otherPagesThan(int page) const {
        std::vector<int> pages = otherPages_;
        pages.push_back(trace_.page);
        std::erase(pages, page);
        return pages;
    }

    PageTrace const& trace_;
    std::vector<int> otherPages_;
    Cfg::ExtractPreset const& preset_;
    Reader::ReadingRules const& rules_;
    ReadPages& pages_;
    Reader::PatternTime& time_;
};

/// The pages behind the first of a letter, up to the next letter, and one that is skipped in front of it.
std::vector<int> otherPagesOf(std::size_t index, Reader::Trace const& trace, int pageCount) {
    int const first = trace.pages[index].page;
    int end = pageCount + 1;
    for (std::size_t later = trace.pages.size(); --later > index;)
        if (trace.pages[later].beginsLetter)
            end = trace.pages[later].page;
    std::vector<int> pages;
    for (int page = first + 1; page < end; ++page)
        pages.push_back(page);
    if (index == 0 && first == 2)
        pages.insert(pages.begin(), 1);
    return pages;
}

} // namespace

json::Object explainPresets(Cfg::Presets const& presets, std::string const& document) {
    json::Array steps;
    for (PresetStep const& step : walkPresets(presets, document))
        steps.append(toJson(step));
    return {{VERSION_KEY, VERSION}, {PRESETS, steps}};
}

void explainPages(json::Object& explanation, Reader::Document& document, Cfg::ExtractPreset const& preset,
                  Reader::ReadingRules const& rules, Reader::Trace const& trace,
                  Reader::PatternLimits const& limits) {
    ReadPages pages(document, Reader::rulesOf(preset));
    Reader::PatternTime time(limits);
    json::Array explained;
    for (std::size_t i = 0; i < trace.pages.size(); ++i)
        explained.append(
            PageExplainer(trace.pages[i], otherPagesOf(i, trace, pages.count()), preset, rules, pages, time)
                .explain());
    explanation.set(PAGE_COUNT, pages.count());
    explanation.set(PAGES, explained);
}

} // namespace VlMail
