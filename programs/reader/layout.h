#pragma once
// The lines and text blocks of a page in reading order. docs/reading.md tells the rules.

#include "programs/reader/lines.h"

#include <cstddef>
#include <vector>

namespace Reader {

/// Lines of one font size below one another; the lines are firstLine to endLine - 1 of the layout.
struct Block {
    Box box;
    std::size_t firstLine = 0;
    std::size_t endLine = 0;
    Turn turn = Turn::Upright;
};

struct Layout {
    /// In reading order: block by block.
    std::vector<Line> lines;
    /// From the top, from the left; those that run another way than most of the page's text come last.
    std::vector<Block> blocks;
    /// The way most of the text runs.
    Turn mainTurn = Turn::Upright;
    /// By which it was made.
    Spacing spacing;

    /// The block whose box is nearest to the point, of those that run the main way; null on an empty page.
    Block const* nearestBlock(Point point) const;
};

/// Every word's font must be one of the page's. Costs n log n in the number of words. The same words in
/// another order give the same layout.
Layout layOut(Page const& page, LayoutRules const& rules = {});

/// The words alone whose centre lies in the location: nothing outside changes what is inside. Gaps are
/// judged as on the whole page.
Layout layOutInside(Page const& page, Spacing const& spacing, Box const& location);

} // namespace Reader
