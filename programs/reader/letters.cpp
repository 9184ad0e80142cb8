#include "programs/reader/letters.h"

#include "programs/reader/field_search.h"

#include <algorithm>
#include <utility>

namespace Reader {
namespace {

using Cfg::ExtractField;
using Cfg::ExtractZone;

template<typename Condition>
bool anyField(Cfg::ExtractZones const& zones, Condition const& condition) {
    return std::any_of(zones.begin(), zones.end(), [&](ExtractZone const& zone) {
        return std::any_of(zone.fields().begin(), zone.fields().end(), condition);
    });
}

bool maySeparateLetters(Cfg::ExtractZones const& zones) {
    return anyField(zones, separatesLetters) && !anyField(zones, [](ExtractField const& field) {
               return field.mark() == LetterSeparatorMark::SingleLetter;
           });
}

FieldsFound searchPage(Document& document, int number, Cfg::ExtractPreset const& preset,
                       ReadingRules const& rules, PatternTime& time, PageTrace* trace) {
    Page const& page = document.page(number);
    Layout const layout = layOut(page, rulesOf(preset));
    FieldSearch search(document.name(), rules, time, trace);
    for (ExtractZone const& zone : preset.zones())
        search.search(zone, textOf(page, layout, zone));
    return search.finish();
}

PageTrace* traceOf(int page, Trace* trace) {
    return trace ? &trace->pages.emplace_back(PageTrace{page, false, {}}) : nullptr;
}

Letter letterOf(FieldsFound found) {
    return {{}, std::move(found.fields), std::move(found.missing), std::move(found.warnings)};
}

} // namespace

std::vector<Letter> readLetters(Document& document, Cfg::ExtractPreset const& preset, Trace* trace,
                                ReadingRules const& rules, PatternLimits const& limits) {
    PatternTime time(limits);
    bool const severalLetters = maySeparateLetters(preset.zones());
    int const firstPage = preset.skipFirstPage() ? 2 : 1;
    std::vector<Letter> letters;
    for (int page = firstPage; page <= document.pageCount(); ++page) {
        if (letters.empty() || severalLetters) {
            PageTrace* const pageTrace = traceOf(page, trace);
            FieldsFound found = searchPage(document, page, preset, rules, time, pageTrace);
            bool const begins = letters.empty() || found.isMarked;
            if (pageTrace)
                pageTrace->beginsLetter = begins;
            if (begins)
                letters.push_back(letterOf(std::move(found)));
        }
        letters.back().pages.push_back(page);
    }
    return letters;
}

Letter readGivenTexts(std::string const& document, std::span<GivenText const> texts, PageTrace* trace,
                      ReadingRules const& rules) {
    PatternTime time;
    FieldSearch search(document, rules, time, trace);
    for (GivenText const& given : texts)
        search.search(*given.zone, ZoneText::given(given.text));
    return letterOf(search.finish());
}

LayoutRules rulesOf(Cfg::ExtractPreset const& preset) {
    return {preset.maxSpacesBetweenFrags(), preset.maxLineDistance(), preset.spaceAdjustPerc()};
}

ZoneText textOf(Page const& page, Layout const& layout, ExtractZone const& zone) {
    if (!zone.hasLocation())
        return ZoneText::nearest(page, layout, zone.mostProbablePoint());
    Cfg::Rect const& location = zone.location();
    return ZoneText::inside(page, layout, {location.left, location.top, location.right, location.bottom});
}

} // namespace Reader
