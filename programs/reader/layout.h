#pragma once
// The lines and text blocks of a page, found from the boxes, font sizes and gaps of its words alone.
// docs/reading.md tells the rules; the numbers stand in layout.cpp.

#include "programs/reader/page.h"

#include <cstddef>
#include <string>
#include <vector>

namespace Reader {

/// What an extraction preset may change.
struct LayoutRules {
    /// The widest gap inside a line, in blanks of its font; a wider one begins another line.
    double maxSpaces = 3.0;
    /// The largest distance of two lines of a block, in font sizes.
    double maxLineDistance = 1.8;
    /// Added to the narrowest gap between words, in per cent of it: more makes fewer blanks.
    int spaceAdjustPerc = 0;
};

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

    /// The block whose box is nearest to the point, of those that run the main way; null on an empty page.
    Block const* nearestBlock(Point point) const;
};

/// Every word's font must be one of the page's. Costs n log n in the number of words. The same words in
/// another order give the same layout.
Layout layOut(Page const& page, LayoutRules const& rules = {});

/// The words of a line, joined by one blank each.
std::string textOf(Page const& page, Line const& line);

} // namespace Reader
