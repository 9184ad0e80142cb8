#pragma once
// What an extraction preset may change of how words become lines, and lines blocks.

namespace Reader {

struct LayoutRules {
    /// The widest gap inside a line, in blanks of its font; a wider one begins another line.
    double maxSpaces = 3.0;
    /// The largest distance of two lines of a block, in font sizes.
    double maxLineDistance = 1.8;
    /// Added to the narrowest gap between words, in per cent of it: more makes fewer blanks.
    int spaceAdjustPerc = 0;
};

} // namespace Reader
