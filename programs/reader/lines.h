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

/// Every word's font must be one of the page's. In no order; costs n log n in the number of words. The same
/// words in another order give the same lines.
std::vector<Line> findLines(Page const& page, LayoutRules const& rules);

/// The words of a line, joined by one blank each.
std::string textOf(Page const& page, Line const& line);

} // namespace Reader
