#include "programs/reader/field_search.h"

#include "programs/base/error.h"
#include "programs/reader/field_labels.h"
#include "programs/reader/value_reading.h"

#include <algorithm>
#include <new>
#include <string_view>
#include <utility>

namespace Reader {
namespace {

using Cfg::ExtractedField;
using Cfg::ExtractField;

/// Answers the width of a match, and takes its lines out of the zone unless they are too wide for the field.
ExtractField::Measure measureFor(ExtractField const& field, ZoneText& text, FieldTrace& trace) {
    return [&](std::string&, unsigned long long offset, unsigned long long length) {
        trace.match = text.stretch(offset, length);
        auto const width = static_cast<unsigned long long>(trace.match->width);
        trace.isTooWide = field.maxWidth() != 0 && field.maxWidth() < width;
        if (!trace.isTooWide)
            trace.cut = text.cutLines(offset, length);
        return width;
    };
}

/// An address from its first line on, over several lines. A pattern that has anything in front of the value
/// says itself how the address begins.
bool beginsAtFirstLine(ExtractField const& field) {
    std::string_view pattern = field.strRegex();
    bool const isOfLines = pattern.starts_with("\\A") || pattern.find("\\n") != pattern.npos;
    for (std::string_view const front : {"(?s)", "(?i)", "\\A", "^"})
        if (pattern.starts_with(front))
            pattern.remove_prefix(front.size());
    return field.priority() > 0 && isOfLines &&
           pattern.starts_with("(?<" + ExtractField::REGEX_VALUE_GROUP_MARK + '>');
}

std::shared_ptr<ExtractedField> cutOut(ExtractField const& field, ZoneText& text, FieldTrace& trace) {
    trace.definition = &field;
    std::shared_ptr<ExtractedField> value =
        field.extractField(text.searchedText(), measureFor(field, text, trace),
                           [&](std::string const& reason) { trace.failure = requireMemory(reason); });
    if (value && !value->isValidated())
        trace.rawText = value->rawValue().textOrEmpty();
    return value;
}

} // namespace

FieldTrace const* PageTrace::counting(std::string const& name) const {
    for (ZoneTrace const& zone : zones)
        for (FieldTrace const& field : zone.fields)
            if (field.counts && field.definition->name() == name)
                return &field;
    return nullptr;
}

FieldSearch::FieldSearch(std::string document, ReadingRules const& rules, PatternTime& time)
    : document_(std::move(document)), rules_(rules), time_(time) {}

void FieldSearch::search(Cfg::ExtractZone const& zone, ZoneView view) {
    zones_.push_back({&zone, zones_.size(), {}});
    zones_.back().sights.push_back(searchAt(zone, std::move(view)));
}

void FieldSearch::search(Cfg::ExtractZone const& zone, std::size_t order, NextView const& next) {
    SearchedZone searched{&zone, order, {}};
    while (std::optional<ZoneView> view = next()) {
        searched.sights.push_back(searchAt(zone, std::move(*view)));
        if (!searched.sights.back().hasFound())
            continue;
        searched.sights.erase(searched.sights.begin(), searched.sights.end() - 1);
        break;
    }
    if (searched.sights.empty())
        searched.sights.push_back(searchAt(zone, {}));
    auto const behind = std::ranges::upper_bound(zones_, order, {}, &SearchedZone::order);
    zones_.insert(behind, std::move(searched));
}

FieldSearch::Sight FieldSearch::searchAt(Cfg::ExtractZone const& zone, ZoneView view) {
    if (view.place.isGivenUp)
        found_.warnings.push_back("zone \"" + zone.name() + "\": " + view.place.whyNowhere);
    ZoneText const& text = view.text;
    ZoneTrace trace{&zone, std::move(view.place), text.text(), text.box(), text.blocks(), {}};
    Sight sight{std::move(view.text), std::move(trace)};
    for (ExtractField const& field : zone.fields())
        search(field, sight);
    return sight;
}

void FieldSearch::search(ExtractField const& field, Sight& sight) {
    Try& one = sight.fields.emplace_back();
    takeValue(one, inTime(one, [&] { return cutField(field, sight.text, one.trace); }));
    requireTime(field);
}

void FieldSearch::searchJoinedLines() {
    for (SearchedZone& zone : zones_) {
        auto const hasFound = [&](Sight& sight) {
            searchJoinedLines(sight);
            return sight.hasFound();
        };
        auto const found = std::ranges::find_if(zone.sights, hasFound);
        if (found != zone.sights.end())
            std::iter_swap(zone.sights.begin(), found);
    }
}

void FieldSearch::searchJoinedLines(Sight& sight) {
    for (Try& field : sight.fields)
        if (!std::exchange(field.isTriedInJoinedLines, true) && field.trace.wantsJoinedLines() &&
            !hasFound(field.name()))
            searchJoinedLines(field, sight.text);
}

void FieldSearch::searchJoinedLines(Try& field, ZoneText& text) {
    ExtractField const& definition = *field.trace.definition;
    auto const judge = [&](ExtractedField const& found) { return worthOf(definition, found); };
    auto value = inTime(field, [&] { return cutJoinedField(definition, text, field.trace, judge); });
    if (value)
        takeValue(field, std::move(value));
    requireTime(definition);
}

Worth FieldSearch::worthOf(ExtractField const& field, ExtractedField const& found) const {
    FieldLabels labels;
    for (SearchedZone const& zone : zones_)
        for (ExtractField const& other : zone.definition->fields())
            labels.add(other);
    if (labels.haveAll(found.rawValue().textOrEmpty(), field))
        return Worth::None;
    ExtractedField value(found);
    try {
        readValue(field, value, rules_);
        return value.isValid() ? Worth::Good : Worth::Poor;
    } catch (std::exception const&) {
        return Worth::Good; // It is said when the value is taken.
    }
}

template<typename Cut>
std::shared_ptr<ExtractedField> FieldSearch::inTime(Try& field, Cut const& cut) {
    PatternTime::Turn turn(time_, field.spent);
    std::shared_ptr<ExtractedField> value = cut();
    field.spent += turn.spent();
    if (turn.isUp())
        found_.warnings.push_back(field.name() + ": its pattern was given up, since it took longer than " +
                                  inSeconds(time_.limits().field) +
                                  "; \"vlmail presets lint\" tells what makes it slow");
    return value;
}

bool FieldSearch::Sight::hasFound() const { return std::ranges::any_of(fields, &Try::isFound); }

bool FieldSearch::hasFound(std::string const& name) const {
    auto const isIt = [&](Try const& field) { return field.isFound && field.name() == name; };
    return std::ranges::any_of(zones_, [&](SearchedZone const& zone) {
        return std::ranges::any_of(
            zone.sights, [&](Sight const& sight) { return std::ranges::any_of(sight.fields, isIt); });
    });
}

void FieldSearch::takeValue(Try& field, std::shared_ptr<ExtractedField> value) {
    field.value = std::move(value);
    if (!field.value)
        return;
    field.isFound = !field.value->isValidated();
    field.trace.doubt = validate(*field.trace.definition, *field.value);
    field.trace.value = field.value;
    isMarked_ = isMarked_ || (field.isFound && separatesLetters(*field.trace.definition));
}

/// The last field is as good as any to look at first: it took some of the time.
void FieldSearch::requireTime(ExtractField const& field) const {
    if (time_.isUp())
        throw Base::Error(
            Base::Code::LimitExceeded,
            document_ + ": its patterns took longer than " + inSeconds(time_.limits().document) +
                ", that of the field \"" + field.name() +
                "\" last; run \"vlmail presets lint\" on the settings and correct the slow ones");
}

std::string FieldSearch::validate(ExtractField const& field, ExtractedField& value) const {
    try {
        PatternTime::Turn turn(time_);
        return readValue(field, value, rules_);
    } catch (std::exception const& failure) {
        throw Base::Error(Base::Code::PatternInvalid, document_ + ": the value of field \"" + field.name() +
                                                          "\" cannot be validated (" + failure.what() +
                                                          "); correct the field's value_match");
    }
}

/// A letter has one value of a name: the first that was found, or else the first in joined lines, or else the
/// first default.
std::vector<FieldSearch::Try*> FieldSearch::countingTries() {
    std::vector<Try*> counting;
    for (SearchedZone& zone : zones_) {
        for (Try& field : zone.sights.front().fields) {
            if (!field.value)
                continue;
            auto const known = std::ranges::find_if(
                counting, [&](Try const* other) { return other->value->name() == field.value->name(); });
            if (known == counting.end())
                counting.push_back(&field);
            else if (field.rank() > (*known)->rank())
                *known = &field;
        }
    }
    return counting;
}

void FieldSearch::hand(Try& counting) {
    counting.trace.counts = true;
    found_.fields.emplace(counting.value->priority(), *counting.value);
    if (!counting.trace.doubt.empty())
        found_.warnings.push_back(counting.value->name() + ": " + counting.trace.doubt);
}

std::vector<ZoneTrace> FieldSearch::zones() const {
    std::vector<ZoneTrace> traces;
    for (SearchedZone const& zone : zones_) {
        traces.push_back(zone.sights.front().trace);
        for (Try const& field : zone.sights.front().fields)
            traces.back().fields.push_back(field.trace);
    }
    return traces;
}

FieldsFound FieldSearch::finish(PageTrace* trace) {
    for (SearchedZone const& zone : zones_)
        for (Try const& field : zone.sights.front().fields)
            if (!field.value && field.trace.definition->mustHave())
                found_.missing.push_back(field.name());
    for (Try* const counting : countingTries())
        hand(*counting);
    if (trace)
        trace->zones = zones();
    return std::move(found_);
}

std::string const& requireMemory(std::string const& reason) {
    if (reason == std::bad_alloc().what())
        throw std::bad_alloc();
    return reason;
}

bool separatesLetters(ExtractField const& field) {
    return field.mark() != LetterSeparatorMark::None && field.mark() != LetterSeparatorMark::SingleLetter;
}

std::shared_ptr<ExtractedField> cutField(ExtractField const& field, ZoneText& text, FieldTrace& trace) {
    if (field.ignoreFontMetrics() || !beginsAtFirstLine(field))
        return cutOut(field, text, trace);
    ZoneText address = text;
    trace.sendersLine = address.cutSmallerLinesAbove();
    if (trace.sendersLine.empty())
        return cutOut(field, text, trace);
    auto value = cutOut(field, address, trace);
    if (value && !value->isValidated())
        text = std::move(address);
    return value;
}

} // namespace Reader
