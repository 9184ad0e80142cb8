#include "programs/reader/layout.h"

#include "programs/reader/blocks.h"

#include <algorithm>
#include <limits>
#include <numeric>
#include <tuple>
#include <utility>

namespace Reader {
namespace {

Box boxOf(std::vector<Line> const& lines, LineChain const& block) {
    Box box = lines[block.front()].box;
    for (std::size_t line : block)
        box = box.united(lines[line].box);
    return box;
}

Turn mainTurnOf(Page const& page, std::vector<std::size_t> const& words) {
    std::array<std::size_t, TURNS.size()> bytes{};
    for (std::size_t const word : words)
        bytes[static_cast<std::size_t>(page.words[word].turn)] += page.words[word].text.size();
    return static_cast<Turn>(std::max_element(bytes.begin(), bytes.end()) - bytes.begin());
}

using Chained = std::vector<std::pair<Block, LineChain>>;

Chained chainedBlocks(std::vector<Line> const& lines, double maxLineDistance) {
    Chained blocks;
    for (Turn turn : TURNS)
        for (LineChain& chain : findBlocks(lines, turn, maxLineDistance)) {
            Block const block{boxOf(lines, chain), 0, 0, turn};
            blocks.emplace_back(block, std::move(chain));
        }
    return blocks;
}

Layout layOutWords(Page const& page, std::vector<std::size_t> const& words, Spacing const& spacing) {
    Layout layout;
    layout.spacing = spacing;
    layout.mainTurn = mainTurnOf(page, words);
    std::vector<Line> lines = findLines(page, words, spacing);
    Chained blocks = chainedBlocks(lines, spacing.maxLineDistance);
    auto const readingOrder = [&](Block const& block) {
        return std::tuple(block.turn != layout.mainTurn, block.box.top, block.box.left, block.box.bottom,
                          block.box.right);
    };
    std::stable_sort(blocks.begin(), blocks.end(), [&](auto const& a, auto const& b) {
        return readingOrder(a.first) < readingOrder(b.first);
    });
    for (auto& [block, chain] : blocks) {
        block.firstLine = layout.lines.size();
        for (std::size_t line : chain)
            layout.lines.push_back(std::move(lines[line]));
        block.endLine = layout.lines.size();
        layout.blocks.push_back(block);
    }
    return layout;
}

} // namespace

Layout layOut(Page const& page, LayoutRules const& rules) {
    std::vector<std::size_t> words(page.words.size());
    std::iota(words.begin(), words.end(), std::size_t{0});
    return layOutWords(page, words, spacingOf(page, rules));
}

Layout layOutInside(Page const& page, Spacing const& spacing, Box const& location) {
    std::vector<std::size_t> words;
    for (std::size_t i = 0; i < page.words.size(); ++i)
        if (location.contains(page.words[i].box.centre()))
            words.push_back(i);
    return layOutWords(page, words, spacing);
}

Block const* Layout::nearestBlock(Point point) const {
    auto const nearestLine = [&](Block const& block) {
        double nearest = std::numeric_limits<double>::infinity();
        for (std::size_t i = block.firstLine; i < block.endLine; ++i)
            nearest = std::min(nearest, lines[i].box.distanceTo(point));
        return nearest;
    };
    Block const* best = nullptr;
    std::pair<double, double> bestDistance;
    for (Block const& block : blocks) {
        if (block.turn != mainTurn)
            continue;
        // Boxes of blocks may overlap, their lines hardly.
        std::pair const distance{block.box.distanceTo(point), nearestLine(block)};
        if (!best || distance < bestDistance) {
            best = &block;
            bestDistance = distance;
        }
    }
    return best;
}

} // namespace Reader
