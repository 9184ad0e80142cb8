#include "programs/reader/field_search.h"

#include "programs/base/error.h"
#include "programs/reader/value_reading.h"

#include <algorithm>
#include <utility>

namespace Reader {
namespace {

using Cfg::ExtractedField;
using Cfg::ExtractField;

/// Answers the width of a match, and takes its lines out of the zone unless they are too wide for the field.
ExtractField::Measure measureFor(ExtractField const& field, ZoneText& text, FieldTrace* trace) {
    return [&field, &text, trace](std::string&, unsigned long long offset, unsigned long long length) {
        Stretch stretch = text.stretch(offset, length);
        auto const width = static_cast<unsigned long long>(stretch.width);
        bool const isTooWide = field.maxWidth() != 0 && field.maxWidth() < width;
        std::string cut = isTooWide ? std::string() : text.cutLines(offset, length);
        if (trace) {
            trace->match = std::move(stretch);
            trace->isTooWide = isTooWide;
            trace->cut = std::move(cut);
        }
        return width;
    };
}

std::string inSeconds(std::chrono::milliseconds time) {
    std::string const rest = std::to_string(1000 + time.count() % 1000).substr(1);
    return std::to_string(time.count() / 1000) + (rest == "000" ? "" : '.' + rest) + " s";
}

} // namespace

FieldTrace const* PageTrace::counting(std::string const& name) const {
    for (ZoneTrace const& zone : zones)
        for (FieldTrace const& field : zone.fields)
            if (field.counts && field.definition->name() == name)
                return &field;
    return nullptr;
}

FieldSearch::FieldSearch(std::string document, ReadingRules const& rules, PatternTime& time, PageTrace* trace)
    : document_(std::move(document)), rules_(rules), time_(time), trace_(trace) {}

void FieldSearch::search(Cfg::ExtractZone const& zone, ZoneText text) {
    if (trace_)
        trace_->zones.push_back({&zone, text.text(), text.box(), text.blocks(), {}});
    for (ExtractField const& field : zone.fields()) {
        search(field, text);
        requireTime(field);
    }
}

void FieldSearch::search(ExtractField const& field, ZoneText& text) {
    FieldTrace* const trace = trace_ ? &trace_->zones.back().fields.emplace_back() : nullptr;
    Yield yield;
    yield.value = cutInTime(field, text, trace);
    if (!yield.value) {
        if (field.mustHave())
            found_.missing.push_back(field.name());
        return;
    }
    yield.isFound = !yield.value->isValidated();
    yield.doubt = validate(field, *yield.value);
    if (trace) {
        trace->doubt = yield.doubt;
        trace->value = std::make_shared<ExtractedField const>(*yield.value);
        yield.zone = trace_->zones.size() - 1;
        yield.field = trace_->zones.back().fields.size() - 1;
    }
    found_.isMarked = found_.isMarked || (yield.isFound && separatesLetters(field));
    take(std::move(yield));
}

std::shared_ptr<ExtractedField> FieldSearch::cutInTime(ExtractField const& field, ZoneText& text,
                                                       FieldTrace* trace) {
    PatternTime::Turn turn(time_);
    auto value = cutField(field, text, trace);
    if (turn.isUp())
        found_.warnings.push_back(field.name() + ": its pattern was given up, since it took longer than " +
                                  inSeconds(time_.limits().field) +
                                  "; \"vlmail presets lint\" tells what makes it slow");
    return value;
}

/// The last field is as good as any to look at first: it took some of the time.
void FieldSearch::requireTime(ExtractField const& field) const {
    if (time_.isUp())
        throw Base::Error(document_ + ": its patterns took longer than " +
                          inSeconds(time_.limits().document) + ", that of the field \"" + field.name() +
                          "\" last; run \"vlmail presets lint\" on the settings and correct the slow ones");
}

std::string FieldSearch::validate(ExtractField const& field, ExtractedField& value) const {
    try {
        PatternTime::Turn turn(time_);
        return readValue(field, value, rules_);
    } catch (std::exception const& failure) {
        throw Base::Error(document_ + ": the value of field \"" + field.name() + "\" cannot be validated (" +
                          failure.what() + "); correct the field's value_match");
    }
}

/// A letter has one value of a name: the first that was found, or else the first default.
void FieldSearch::take(Yield yield) {
    auto const known = std::find_if(yields_.begin(), yields_.end(), [&](Yield const& other) {
        return other.value->name() == yield.value->name();
    });
    if (known == yields_.end())
        yields_.push_back(std::move(yield));
    else if (yield.isFound && !known->isFound)
        *known = std::move(yield);
}

FieldsFound FieldSearch::finish() {
    for (Yield const& yield : yields_) {
        found_.fields.emplace(yield.value->priority(), *yield.value);
        if (!yield.doubt.empty())
            found_.warnings.push_back(yield.value->name() + ": " + yield.doubt);
    }
    if (trace_)
        traceWhatCounts();
    return std::move(found_);
}

void FieldSearch::traceWhatCounts() {
    for (Yield const& yield : yields_)
        trace_->zones[yield.zone].fields[yield.field].counts = true;
}

bool separatesLetters(ExtractField const& field) {
    return field.mark() != LetterSeparatorMark::None && field.mark() != LetterSeparatorMark::SingleLetter;
}

std::shared_ptr<ExtractedField> cutField(ExtractField const& field, ZoneText& text, FieldTrace* trace) {
    std::shared_ptr<ExtractedField> value = field.extractField(
        text.searchedText(), measureFor(field, text, trace), [trace](std::string const& reason) {
            if (trace)
                trace->failure = reason;
        });
    if (trace) {
        trace->definition = &field;
        if (value && !value->isValidated())
            trace->rawText = value->rawValue().textOrEmpty();
    }
    return value;
}

} // namespace Reader
