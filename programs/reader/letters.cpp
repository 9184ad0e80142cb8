#include "programs/reader/letters.h"

#include "programs/reader/field_search.h"

#include <algorithm>
#include <iterator>
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

/// Only what stands on first pages tells letters apart.
bool maySeparateLetters(Cfg::ExtractZones const& zones, ReadingRules const& rules) {
    Cfg::ExtractZones first;
    std::copy_if(zones.begin(), zones.end(), std::back_inserter(first),
                 [&](ExtractZone const& zone) { return rules.isOnFirstPage(zone.name()); });
    return anyField(first, separatesLetters) && !anyField(zones, [](ExtractField const& field) {
               return field.mark() == LetterSeparatorMark::SingleLetter;
           });
}

Letter letterOf(FieldsFound found) {
    return {{}, std::move(found.fields), std::move(found.missing), std::move(found.warnings)};
}

struct LaidOutPage {
    Page const* page = nullptr;
    Layout layout = {};
};

/// Reads a document page by page.
class LetterReader {
public:
    LetterReader(Document& document, Cfg::ExtractPreset const& preset, Trace* trace,
                 ReadingRules const& rules, PatternLimits const& limits)
        : document_(document), preset_(preset), trace_(trace), rules_(rules), time_(limits) {
        if (maySeparateLetters(preset.zones(), rules))
            joins_.emplace(preset, rules, limits);
    }

    void read(int page) {
        if (!open_ || joins_)
            search(page);
        open_->pages.push_back(page);
    }

    std::vector<Letter> take() {
        close();
        if (joins_)
            doubtJoins();
        return std::move(letters_);
    }

private:
    /// A letter to which further pages may come.
    struct OpenLetter {
        FieldSearch search;
        std::vector<int> pages = {};
        /// Its page among those of the trace.
        std::size_t trace = 0;
    };

    void search(int number) {
        LaidOutPage const& page = laidOut(number);
        FieldSearch search(document_.name(), rules_, time_);
        Cfg::ExtractZones const& zones = preset_.zones();
        for (std::size_t i = 0; i < zones.size(); ++i)
            if (rules_.isOnFirstPage(zones[i].name()))
                search.search(zones[i], i, once(viewOn(page, zones[i])));
        search.searchJoinedLines();
        bool const begins = !open_ || search.isMarked();
        if (joins_)
            joins_->see(*page.page, page.layout, {number, begins, search.zones()});
        if (begins)
            begin(number, std::move(search));
        else if (trace_)
            trace_->pages.push_back({number, false, search.zones()});
    }

    void begin(int page, FieldSearch search) {
        close();
        open_.emplace(OpenLetter{std::move(search)});
        if (!trace_)
            return;
        open_->trace = trace_->pages.size();
        trace_->pages.push_back({page, true, {}});
    }

    /// The pages of the open letter are known, and with them where its other zones lie.
    void close() {
        if (!open_)
            return;
        Cfg::ExtractZones const& zones = preset_.zones();
        for (std::size_t i = 0; i < zones.size(); ++i)
            if (!rules_.isOnFirstPage(zones[i].name()))
                searchOtherPages(zones[i], i);
        open_->search.searchJoinedLines();
        Letter letter = letterOf(open_->search.finish(trace_ ? &trace_->pages[open_->trace] : nullptr));
        letter.pages = std::move(open_->pages);
        letters_.push_back(std::move(letter));
        open_.reset();
    }

    void searchOtherPages(ExtractZone const& zone, std::size_t order) {
        std::vector<int> pages = pagesFor(*rules_.forZone(zone.name()));
        if (pages.empty())
            return open_->search.search(zone, order, once(nowhere(zone)));
        open_->search.search(zone, order, [&, at = pages.begin()]() mutable -> std::optional<ZoneView> {
            if (at == pages.end())
                return std::nullopt;
            return viewOn(laidOut(*at++), zone);
        });
    }

    /// Of the open letter, in the order in which they are looked at.
    std::vector<int> pagesFor(ZoneRules const& rules) const {
        std::vector<int> const& pages = open_->pages;
        if (rules.pages == ZoneRules::Pages::Any)
            return pages;
        if (rules.pages == ZoneRules::Pages::Last)
            return {pages.back()};
        auto const index = static_cast<std::size_t>(rules.page) - 1;
        return index < pages.size() ? std::vector{pages[index]} : std::vector<int>();
    }

    static NextView once(ZoneView view) {
        return
            [next = std::optional(std::move(view))]() mutable { return std::exchange(next, std::nullopt); };
    }

    ZoneView nowhere(ExtractZone const& zone) const {
        ZonePlace place;
        place.whyNowhere = "the letter has no page " + std::to_string(rules_.forZone(zone.name())->page);
        return {{}, std::move(place)};
    }

    /// Until another page is asked for.
    LaidOutPage const& laidOut(int number) {
        Page const& page = document_.page(number);
        if (laidOut_.page != &page)
            laidOut_ = {&page, layOut(page, rulesOf(preset_))};
        return laidOut_;
    }

    ZoneView viewOn(LaidOutPage const& page, ExtractZone const& zone) {
        PatternTime::Turn const turn(time_);
        ZoneRules const* const rules = rules_.forZone(zone.name());
        return viewOf(*page.page, page.layout, zone, rules ? *rules : ZoneRules());
    }

    void noteInTrace(DoubtfulJoin const& join) {
        if (!trace_)
            return;
        auto const page = std::ranges::find(trace_->pages, join.page, &PageTrace::page);
        if (page != trace_->pages.end())
            page->doubtfulJoin = PageTrace::Doubt{join.says, join.box};
    }

    void doubtJoins() {
        std::size_t letter = 0;
        for (DoubtfulJoin& join : joins_->doubtful()) {
            while (letters_[letter].pages.back() < join.page)
                ++letter;
            noteInTrace(join);
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
    LaidOutPage laidOut_;
    std::optional<OpenLetter> open_;
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
    FieldSearch search(document, rules, time);
    for (GivenText const& given : texts)
        search.search(*given.zone, {ZoneText::given(given.text), {}});
    return letterOf(search.finish(trace));
}

LayoutRules rulesOf(Cfg::ExtractPreset const& preset) {
    return {preset.maxSpacesBetweenFrags(), preset.maxLineDistance(), preset.spaceAdjustPerc()};
}

} // namespace Reader
