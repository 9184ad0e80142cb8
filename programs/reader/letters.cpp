#include "programs/reader/letters.h"

#include "programs/reader/field_search.h"

#include <algorithm>
#include <optional>
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

Letter letterOf(FieldsFound found) {
    return {{}, std::move(found.fields), std::move(found.missing), std::move(found.warnings)};
}

/// Reads a document page by page.
class LetterReader {
public:
    LetterReader(Document& document, Cfg::ExtractPreset const& preset, Trace* trace,
                 ReadingRules const& rules, PatternLimits const& limits)
        : document_(document), preset_(preset), trace_(trace), rules_(rules), time_(limits) {
        if (maySeparateLetters(preset.zones()))
            joins_.emplace(preset, limits);
    }

    void read(int page) {
        if (letters_.empty() || joins_)
            search(page);
        letters_.back().pages.push_back(page);
    }

    std::vector<Letter> take() {
        if (joins_)
            doubtJoins();
        return std::move(letters_);
    }

private:
    void search(int number) {
        Page const& page = document_.page(number);
        Layout const layout = layOut(page, rulesOf(preset_));
        PageTrace pageTrace{number, false, {}};
        FieldSearch search(document_.name(), rules_, time_, trace_ || joins_ ? &pageTrace : nullptr);
        for (ExtractZone const& zone : preset_.zones())
            search.search(zone, textOf(page, layout, zone));
        search.searchJoinedLines();
        FieldsFound found = search.finish();
        pageTrace.beginsLetter = letters_.empty() || found.isMarked;
        if (pageTrace.beginsLetter)
            letters_.push_back(letterOf(std::move(found)));
        if (joins_)
            joins_->see(page, layout, pageTrace);
        if (trace_)
            trace_->pages.push_back(std::move(pageTrace));
    }

    void doubtJoins() {
        std::size_t letter = 0;
        for (DoubtfulJoin& join : joins_->doubtful()) {
            while (letters_[letter].pages.back() < join.page)
                ++letter;
            letters_[letter].doubtfulJoins.push_back(std::move(join));
        }
        if (int const page = joins_->givenUpAt(); page > 0)
            letters_.back().warnings.push_back(
                "pages: from page " + std::to_string(page) +
                " on it was not looked whether a mark is missing, since the marks' patterns take too long");
    }

    Document& document_;
    Cfg::ExtractPreset const& preset_;
    Trace* trace_;
    ReadingRules const& rules_;
    PatternTime time_;
    /// There when letters are told apart.
    std::optional<JoinWatch> joins_;
    std::vector<Letter> letters_;
};

} // namespace

std::vector<Letter> readLetters(Document& document, Cfg::ExtractPreset const& preset, Trace* trace,
                                ReadingRules const& rules, PatternLimits const& limits) {
    LetterReader reader(document, preset, trace, rules, limits);
    for (int page = preset.skipFirstPage() ? 2 : 1; page <= document.pageCount(); ++page)
        reader.read(page);
    return reader.take();
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
