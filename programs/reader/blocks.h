#pragma once
// Which lines of a page make a block of text.

#include "programs/reader/lines.h"

#include <cstddef>
#include <vector>

namespace Reader {

/// A block's lines from top to bottom, by their position among all lines.
using LineChain = std::vector<std::size_t>;

/// The blocks of the lines that run that way. The lines of a block are at most `maxLineDistance` font sizes
/// apart.
std::vector<LineChain> findBlocks(std::vector<Line> const& lines, Turn turn, double maxLineDistance);

} // namespace Reader
