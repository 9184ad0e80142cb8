#include "programs/reader/layout.h"

#include "programs/reader/blocks.h"

#include <algorithm>
#include <limits>
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

Turn mainTurnOf(Page const& page) {
    std::array<std::size_t, TURNS.size()> letters{};
    for (Word const& word : page.words)
        letters[static_cast<std::size_t>(word.turn)] += word.text.size();
    return static_cast<Turn>(std::max_element(letters.begin(), letters.end()) - letters.begin());
}

} // namespace

Layout layOut(Page const& page, LayoutRules const& rules) {
    Layout layout;
    if (page.words.empty())
        return layout;
    layout.mainTurn = mainTurnOf(page);
    std::vector<Line> lines = findLines(page, rules);

    std::vector<std::pair<Block, LineChain>> blocks;
    for (Turn turn : TURNS)
        for (LineChain& chain : findBlocks(lines, turn, rules.maxLineDistance)) {
            Block const block{boxOf(lines, chain), 0, 0, turn};
            blocks.emplace_back(block, std::move(chain));
        }
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
