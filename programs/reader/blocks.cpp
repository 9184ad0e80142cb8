#include "programs/reader/blocks.h"

#include <algorithm>
#include <optional>
#include <tuple>
#include <utility>

namespace Reader {
namespace {

// Lengths are in font sizes.

/// Lines that are nearer stand side by side and are never of one block.
constexpr double MIN_LINE_DISTANCE = 0.3;
/// From this ratio on, two sizes are different: an address and the sender's small line above it.
constexpr double OTHER_SIZE = 1.2;

/// Lines looked at for one below them, so that no page costs more than in proportion to its words.
constexpr std::size_t MAX_CANDIDATES = 64;

/// A line among those of its turn, from top to bottom.
struct PlacedLine {
    Frame frame;
    std::size_t line = 0;
    std::optional<std::size_t> next;
    bool hasBefore = false;
};

bool continues(Line const& upper, Frame const& upperFrame, Line const& lower, Frame const& lowerFrame,
               double maxLineDistance) {
    auto const [smaller, larger] = std::minmax(upper.size, lower.size);
    double const distance = lowerFrame.bottom - upperFrame.bottom;
    return larger < OTHER_SIZE * smaller && distance >= MIN_LINE_DISTANCE * larger &&
           distance <= maxLineDistance * larger && lowerFrame.start < upperFrame.end &&
           upperFrame.start < lowerFrame.end;
}

/// Gives each line at most one line below it, the nearest: columns under one heading stay apart.
void chain(std::vector<PlacedLine>& placed, std::vector<Line> const& lines, double maxLineDistance) {
    // Lines without one below them yet, in the order of `placed`.
    std::vector<std::size_t> tails;
    for (std::size_t i = 0; i < placed.size(); ++i) {
        std::size_t best = tails.size();
        std::pair<int, int> bestDistance;
        std::size_t left = MAX_CANDIDATES;
        for (std::size_t t = tails.size(); t-- > 0 && left-- > 0;) {
            PlacedLine const& upper = placed[tails[t]];
            if (!continues(lines[upper.line], upper.frame, lines[placed[i].line], placed[i].frame,
                           maxLineDistance))
                continue;
            std::pair const distance{placed[i].frame.bottom - upper.frame.bottom,
                                     std::abs(placed[i].frame.start - upper.frame.start)};
            if (best == tails.size() || distance < bestDistance) {
                best = t;
                bestDistance = distance;
            }
        }
        if (best < tails.size()) {
            placed[tails[best]].next = i;
            placed[i].hasBefore = true;
            tails.erase(tails.begin() + static_cast<std::ptrdiff_t>(best));
        }
        tails.push_back(i);
        if (tails.size() > 2 * MAX_CANDIDATES)
            tails.erase(tails.begin(), tails.end() - MAX_CANDIDATES);
    }
}

} // namespace

std::vector<LineChain> findBlocks(std::vector<Line> const& lines, Turn turn, double maxLineDistance) {
    std::vector<PlacedLine> placed;
    for (std::size_t i = 0; i < lines.size(); ++i)
        if (lines[i].turn == turn)
            placed.push_back({frameOf(lines[i].box, turn), i, {}, false});
    std::sort(placed.begin(), placed.end(), [](PlacedLine const& a, PlacedLine const& b) {
        return std::tie(a.frame.bottom, a.frame.start, a.frame.end) <
               std::tie(b.frame.bottom, b.frame.start, b.frame.end);
    });
    chain(placed, lines, maxLineDistance);

    std::vector<LineChain> blocks;
    for (PlacedLine const& first : placed) {
        if (first.hasBefore)
            continue;
        blocks.push_back({first.line});
        for (PlacedLine const* at = &first; at->next;) {
            at = &placed[*at->next];
            blocks.back().push_back(at->line);
        }
    }
    return blocks;
}

} // namespace Reader
