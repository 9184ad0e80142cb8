#pragma once
// Words that are set with room between their letters: "R E C H N U N G".

#include <cstdint>
#include <string_view>
#include <vector>

namespace Reader {

/// A word of a line, from left to right.
struct SetWord {
    std::string_view text;
    /// Between it and the word before it, in 1/100 mm.
    int gapBefore = 0;
    int size = 0;
    std::uint16_t font = 0;
};

/// Says of each word whether it belongs to the one before it: in a row of single letters the narrow gaps are
/// inside words. Rows without four letters that stand as near as any are left alone, and so are figures.
std::vector<bool> belongsToWordBefore(std::vector<SetWord> const& words);

} // namespace Reader
