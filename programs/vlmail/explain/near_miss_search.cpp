#include "programs/vlmail/explain/near_miss_search.h"

#include "programs/base/quoting.h"
#include "programs/reader/field_search.h"
#include "programs/reader/joined_search.h"
#include "programs/reader/value_reading.h"

#include <algorithm>
#include <limits>
#include <utility>

namespace VlMail {

using Cfg::ExtractedField;
using Cfg::ExtractField;
using Reader::Box;
using Reader::FieldTrace;
using Reader::ZoneText;

namespace {

constexpr std::size_t MAX_OTHER_PAGES = 20;
constexpr std::size_t MAX_FAILURES = 2;

constexpr Box EVERYWHERE{std::numeric_limits<int>::min(), std::numeric_limits<int>::min(),
                         std::numeric_limits<int>::max(), std::numeric_limits<int>::max()};

bool isValid(ExtractField const& field, ExtractedField value, Reader::ReadingRules const& rules) {
    try {
        Reader::readValue(field, value, rules);
        return value.isValid();
    } catch (std::exception const&) {
        return false;
    }
}

} // namespace

std::string Search::zoneName() const { return "zone " + Base::inQuotes(zone().name()); }

std::vector<int> Search::otherPages() const {
    std::vector<int> pages = missed_.otherPages;
    pages.resize(std::min(pages.size(), MAX_OTHER_PAGES));
    return pages;
}

ZoneText Search::textOn(LaidOutPage const& page, Cfg::ExtractZone const& zone) const {
    Reader::ZoneRules const* const rules = missed_.rulesFor(zone);
    return viewOf(*page.page, page.layout, zone, rules ? *rules : Reader::ZoneRules()).text;
}

ZoneText Search::textInside(Box const& location) const {
    return ZoneText::inside(*page_.page, page_.layout, location, missed_.zone.place.order);
}

ZoneText Search::everythingOn(LaidOutPage const& page) {
    return ZoneText::inside(*page.page, page.layout, EVERYWHERE);
}

ZoneText Search::remaining(ZoneText text) const {
    for (FieldTrace const* const earlier : earlierFields()) {
        FieldTrace taken;
        cutAsItStands(*earlier->definition, text, taken);
    }
    return text;
}

std::vector<FieldTrace const*> Search::earlierFields() const {
    std::vector<FieldTrace const*> earlier;
    for (FieldTrace const& trace : missed_.zone.fields) {
        if (&trace == &missed_.field)
            break;
        earlier.push_back(&trace);
    }
    return earlier;
}

ExtractField Search::withPattern(std::string const& pattern) const {
    ExtractField variant(field());
    variant.setRegex(pattern);
    return variant;
}

std::shared_ptr<ExtractedField> Search::cutAsItStands(ExtractField const& field, ZoneText& text,
                                                      FieldTrace& trace) const {
    if (isGivenUp())
        return nullptr;
    std::shared_ptr<ExtractedField> value = cutField(field, text, trace);
    if (trace.failure)
        failures_.push_back(*trace.failure);
    return value;
}

std::optional<Hit> Search::cut(ExtractField const& field, ZoneText& text) const {
    FieldTrace trace;
    trace.definition = &field;
    std::shared_ptr<ExtractedField> value = cutAsItStands(field, text, trace);
    if (trace.wantsJoinedLines() && !isGivenUp()) {
        value = cutJoinedField(field, text, trace, [&](ExtractedField const& found) {
            return isValid(field, found, missed_.rules) ? Reader::Worth::Good : Reader::Worth::Poor;
        });
        if (trace.failure)
            failures_.push_back(*trace.failure);
    }
    if (!trace.match)
        return std::nullopt;
    return Hit{std::move(*trace.match), trace.rawText && value && isValid(field, *value, missed_.rules)};
}

std::optional<PlainHit> Search::find(ExtractField const& field, std::string text) const {
    if (isGivenUp())
        return std::nullopt;
    std::optional<PlainHit> hit;
    ExtractField::Measure const remember = [&](std::string&, unsigned long long offset,
                                               unsigned long long length) {
        hit = PlainHit{static_cast<std::size_t>(offset), static_cast<std::size_t>(offset + length), false};
        return 0;
    };
    auto const value = field.extractField(text, remember, [this](std::string const& reason) {
        failures_.push_back(Reader::requireMemory(reason));
    });
    if (hit && value)
        hit->isValid = isValid(field, *value, missed_.rules);
    return hit;
}

bool Search::isGivenUp() const { return failures_.size() >= MAX_FAILURES || turn_.isUp(); }

} // namespace VlMail
