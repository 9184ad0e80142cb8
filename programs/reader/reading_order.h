#pragma once
// In which order the text blocks of a zone are read.

#include "programs/reader/layout.h"

#include <vector>

namespace Reader {

enum class ReadingOrder : unsigned char {
    Rows,    ///< from the top, and from the left what stands side by side: as a layout has them
    Columns, ///< column by column from the left
};

/// The blocks column by column. A block over several columns, such as a heading, ends those above it and
/// stands in front of those below it. Blocks that run another way than the main one stay behind. Costs
/// n log n.
std::vector<Block> byColumns(Layout const& layout);

} // namespace Reader
