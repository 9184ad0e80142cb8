#pragma once
// The text of a zone with its place on the page: fields are searched in it, and each stretch of it can be
// measured.

#include "programs/reader/joined_lines.h"
#include "programs/reader/reading_order.h"

#include <cstddef>
#include <string>
#include <vector>

namespace Reader {

/// Lines longer than this are cut: patterns may take time that grows with a power of a line's length.
constexpr std::size_t MAX_LINE_LENGTH = 1000;

/// A stretch of a zone's text.
struct Stretch {
    std::string text;
    /// Around its letters on the page; an empty box for an empty stretch.
    Box box;
    /// Of its widest line, in 1/100 mm along the line.
    int width = 0;
};

/// Lines joined by line feeds, the words of a line by one blank; there is no line feed at the end.
/// Holds references to the page, which must live longer.
class ZoneText {
public:
    /// The words whose centre lies in the location, laid out without the others: block by block, or from top
    /// to bottom where no lines stand side by side.
    static ZoneText inside(Page const& page, Layout const& layout, Box const& location,
                           ReadingOrder order = ReadingOrder::Rows);
    /// The block nearest to the point.
    static ZoneText nearest(Page const& page, Layout const& layout, Point point);
    /// The same block, and the ones right above and below it where only all of them together read as a postal
    /// address, from top to bottom.
    static ZoneText nearestAddress(Page const& page, Layout const& layout, Point point);
    /// Text that stands on no page; its lines are cut as those of a page are.
    static ZoneText given(std::string const& text);

    std::string const& text() const { return text_; }
    /// For a search that wants a reference it could write to; only cutLines() changes the text.
    std::string& searchedText() { return text_; }
    /// The boxes of the text blocks that the text came from, in reading order.
    std::vector<Box> const& blocks() const { return blocks_; }
    /// Around all words that the zone had at the start.
    Box const& box() const { return box_; }

    /// What stands at these bytes of text(); words that are only partly in it count by their letters.
    Stretch stretch(std::size_t offset, std::size_t length) const;
    /// Takes the lines of smaller print away that stand above the others: the sender's, of a zone with an
    /// address. Gives their text, which is empty when there are none.
    std::string cutSmallerLinesAbove();
    /// Takes the lines that have a letter in these bytes out of text(), with their line breaks, and gives
    /// their text.
    std::string cutLines(std::size_t offset, std::size_t length);
    /// The lines that text() has, from its first; none of text that stands on no page.
    std::vector<PlacedLine> placedLines() const;

private:
    struct Piece {
        /// Bytes of the line.
        std::size_t begin = 0;
        std::size_t end = 0;
        Word const* word = nullptr;
    };
    struct TextLine {
        std::vector<Piece> pieces;
        std::size_t length = 0;
        /// Of its print, and where it stands; nothing of text that stands nowhere.
        int size = 0;
        Frame frame = {};
    };
    /// Whole lines, and the bytes of text() that they take without their last line break.
    struct LineRange {
        std::size_t first = 0;
        std::size_t end = 0;
        std::size_t textBegin = 0;
        std::size_t textEnd = 0;
    };

    static ZoneText ofBlocks(Page const& page, Layout const& layout, std::vector<Block const*> const& blocks);
    void addBlock(Block const& block);
    void addLine(Page const& page, Line const& line);
    std::size_t countSmallerLinesAbove() const;
    TextLine lineOf(Page const& page, Line const& line);
    LineRange linesAt(std::size_t offset, std::size_t length) const;

    std::string text_;
    std::vector<TextLine> lines_;
    std::vector<Box> blocks_;
    Box box_;
};

} // namespace Reader
