#include "programs/production/letter_parts.h"

#include <algorithm>
#include <cstdlib>
#include <numeric>

namespace Production {
namespace {

/// In 1/100 mm: paper is cut less exactly than that.
constexpr int SAME_SIZE = 200;

constexpr PackForcedOrientation UPRIGHT{1};
constexpr PackForcedOrientation ACROSS{2};

/// The page of a letterhead that belongs to page `number`, or 0.
int pageFor(int number, int pageCount, bool lastRepeats) {
    if (number <= pageCount)
        return number;
    return lastRepeats ? pageCount : 0;
}

} // namespace

bool appliesTo(Part const& part, Cfg::LetterheadInf const& letterhead) {
    if (!part.isAttachment())
        return !letterhead.skipLetters &&
               (part.kind == Part::Kind::FirstLetter || !letterhead.applyFirstGroupedOnly);
    std::vector<std::string> const& which = letterhead.whichAttachments;
    return !letterhead.skipAttachments &&
           (which.empty() || std::find(which.begin(), which.end(), part.id) != which.end());
}

Layers layersOn(int number, Part const& part, std::vector<Cfg::LetterheadInf> const& letterheads,
                std::vector<int> const& pageCounts) {
    Layers layers;
    for (std::size_t i = 0; i < letterheads.size(); ++i) {
        Cfg::LetterheadInf const& letterhead = letterheads[i];
        int const page = pageFor(number, pageCounts.at(i), letterhead.repeatLastPage);
        if (page > 0 && appliesTo(part, letterhead))
            (letterhead.onTop ? layers.over : layers.under).push_back({i, page});
    }
    return layers;
}

AttachmentOrder orderOf(std::vector<Cfg::PackPreset::Attachment> const& attachments) {
    std::vector<std::size_t> positioned;
    std::vector<std::size_t> others;
    for (std::size_t i = 0; i < attachments.size(); ++i)
        (attachments[i].preferredPos == Cfg::PackPreset::Attachment::NO_PREFERRED_POS ? others : positioned)
            .push_back(i);
    std::stable_sort(positioned.begin(), positioned.end(), [&](std::size_t a, std::size_t b) {
        return attachments[a].preferredPos < attachments[b].preferredPos;
    });
    auto const first = std::find_if(positioned.begin(), positioned.end(),
                                    [&](std::size_t i) { return attachments[i].preferredPos >= 0; });
    AttachmentOrder order{{positioned.begin(), first}, {first, positioned.end()}};
    order.behind.insert(order.behind.end(), others.begin(), others.end());
    return order;
}

bool endsWithBlank(int pages, Sides sides) { return sides == Sides::Both && pages % 2 == 1; }

long long sheetsOf(std::vector<int> const& pageCounts, Sides sides) {
    return std::accumulate(pageCounts.begin(), pageCounts.end(), 0LL, [&](long long sum, int pages) {
        return sum + (sides == Sides::Both ? (pages + 1LL) / 2 : pages);
    });
}

bool areAlike(PageSize one, PageSize other) {
    return std::abs(one.width - other.width) <= SAME_SIZE && std::abs(one.height - other.height) <= SAME_SIZE;
}

int quarterTurnsFor(PackForcedOrientation orientation, PageSize page) {
    if (orientation == UPRIGHT && page.width > page.height)
        return 3;
    return orientation == ACROSS && page.height > page.width ? 1 : 0;
}

} // namespace Production
