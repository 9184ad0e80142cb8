#include "programs/reader/reading_order.h"

#include <algorithm>
#include <cstddef>
#include <map>
#include <tuple>

namespace Reader {
namespace {

struct PlacedBlock {
    Block block;
    Frame frame;
    /// It lies over several columns.
    bool isWide = false;
    /// The left edge of its column.
    int column = 0;
    /// The number of wide blocks above it.
    std::size_t section = 0;
};

PlacedBlock placedBlock(Block const& block) {
    Frame frame = frameOf(block.box, block.turn);
    frame.end = std::max(frame.end, frame.start + 1);
    return {block, frame};
}

/// Columns that do not overlap, by their left edges.
class Columns {
public:
    /// Whether the block lies in one column at most, which then holds it.
    bool take(Frame const& frame) {
        auto const first = firstBehind(frame.start);
        if (first == ends_.end() || first->first >= frame.end) {
            ends_.emplace(frame.start, frame.end);
            return true;
        }
        auto const next = std::next(first);
        if (next != ends_.end() && next->first < frame.end)
            return false;
        int const start = std::min(first->first, frame.start);
        int const end = std::max(first->second, frame.end);
        ends_.erase(first);
        ends_.emplace(start, end);
        return true;
    }

    /// Of the column that took the block.
    int startOf(Frame const& frame) const { return firstBehind(frame.start)->first; }

private:
    using Ends = std::map<int, int>;

    /// The first column that ends behind there.
    Ends::const_iterator firstBehind(int start) const {
        auto at = ends_.upper_bound(start);
        if (at != ends_.begin() && std::prev(at)->second > start)
            --at;
        return at;
    }

    Ends ends_;
};

/// Narrow blocks make the columns; a block that reaches into two of them belongs to none.
void findColumns(std::vector<PlacedBlock>& placed) {
    std::vector<PlacedBlock*> byWidth;
    for (PlacedBlock& one : placed)
        byWidth.push_back(&one);
    std::stable_sort(byWidth.begin(), byWidth.end(), [](PlacedBlock const* a, PlacedBlock const* b) {
        return a->frame.end - a->frame.start < b->frame.end - b->frame.start;
    });
    Columns columns;
    for (PlacedBlock* one : byWidth)
        one->isWide = !columns.take(one->frame);
    for (PlacedBlock& one : placed)
        one.column = one.isWide ? one.frame.start : columns.startOf(one.frame);
}

/// Counts for each block the wide ones that begin above it.
void findSections(std::vector<PlacedBlock>& placed) {
    std::vector<int> wide;
    for (PlacedBlock const& one : placed)
        if (one.isWide)
            wide.push_back(one.frame.top);
    std::sort(wide.begin(), wide.end());
    for (PlacedBlock& one : placed)
        one.section = static_cast<std::size_t>(std::lower_bound(wide.begin(), wide.end(), one.frame.top) -
                                               wide.begin());
}

} // namespace

std::vector<Block> byColumns(Layout const& layout) {
    std::vector<PlacedBlock> placed;
    std::vector<Block> others;
    for (Block const& block : layout.blocks)
        if (block.turn == layout.mainTurn)
            placed.push_back(placedBlock(block));
        else
            others.push_back(block);
    findColumns(placed);
    findSections(placed);
    // What stands above a wide block has its section: the wide block is the last of it.
    std::stable_sort(placed.begin(), placed.end(), [](PlacedBlock const& a, PlacedBlock const& b) {
        return std::tuple(a.section, a.isWide, a.column, a.frame.top, a.frame.start) <
               std::tuple(b.section, b.isWide, b.column, b.frame.top, b.frame.start);
    });
    std::vector<Block> blocks;
    for (PlacedBlock const& one : placed)
        blocks.push_back(one.block);
    blocks.insert(blocks.end(), others.begin(), others.end());
    return blocks;
}

} // namespace Reader
