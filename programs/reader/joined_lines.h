#pragma once
// Which lines of a zone that stand apart may be read as one: a label and what stands beside or below it.

#include "programs/reader/geometry.h"

#include <cstddef>
#include <vector>

namespace Reader {

/// A line of a zone's text: its bytes there, and its place on the page.
struct PlacedLine {
    std::size_t offset = 0;
    std::size_t length = 0;
    Box box;
    /// Of its largest word, in 1/100 mm.
    int size = 0;
    Turn turn = Turn::Upright;
};

/// Where the lines stand that are joined to the first.
enum class Joint : unsigned char {
    Right, ///< at the same height
    Below, ///< in the same column
};

struct LineJoin {
    Joint joint = Joint::Right;
    /// Positions among the lines that were given, in the order in which they are read.
    std::vector<std::size_t> lines;
};

/// The joins in the order in which they are tried. First each line with its right neighbour, the nearest pair
/// in front, then the rows of three and four lines; then each line with the one below it. Costs n log n in
/// the number of lines.
std::vector<LineJoin> joinsOf(std::vector<PlacedLine> const& lines);

} // namespace Reader
