#pragma once
// The lines of a page, found from the boxes, font sizes and gaps of its words alone.
// docs/reading.md tells the rules; the numbers stand in lines.cpp.

#include "programs/reader/layout_rules.h"
#include "programs/reader/page.h"

#include <cstddef>
#include <string>
#include <vector>

namespace Reader {

struct LineWord {
    /// Position in Page::words.
    std::size_t word = 0;
    /// A blank stands between this word and the one before it.
    bool blankBefore = false;
};

struct Line {
    std::vector<LineWord> words;
    Box box;
    /// Of most of its text, in 1/100 mm.
    int size = 0;
    Turn turn = Turn::Upright;
};

/// How far apart words and lines may stand, by the rules and by what a page tells of its blanks.
struct Spacing {
    /// The widest gap inside a line by font, in font sizes.
    std::vector<double> gapLimits;
    /// The narrowest gap between two words, in font sizes.
    double minWordGap = 0;
    double maxLineDistance = 0;
};

/// Every word's font must be one of the page's.
Spacing spacingOf(Page const& page, LayoutRules const& rules);

/// The lines of some words, by their positions in Page::words. In no order; costs n log n in the number of
/// words. The same words in another order give the same lines.
std::vector<Line> findLines(Page const& page, std::vector<std::size_t> const& words, Spacing const& spacing);

/// The words of a line, joined by one blank each.
std::string textOf(Page const& page, Line const& line);

} // namespace Reader
