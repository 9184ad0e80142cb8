#include "programs/reader/zone_text.h"

#include "programs/base/utf8.h"
#include "programs/reader/address_text.h"

#include <algorithm>
#include <optional>
#include <string_view>
#include <utility>

namespace Reader {
namespace {

/// Between the blocks of one address, in font sizes: a blank line, and what a form leaves free.
constexpr int MOST_FREE_LINES = 3;

/// The part of a word's box that some of its characters take, as if all were equally wide.
Box partOf(Word const& word, std::size_t begin, std::size_t end) {
    std::string_view const text = word.text;
    double const characters = static_cast<double>(Base::characterCount(text));
    double const from = static_cast<double>(Base::characterCount(text.substr(0, begin))) / characters;
    double const to = static_cast<double>(Base::characterCount(text.substr(0, end))) / characters;
    return partAlong(word.box, word.turn, from, to);
}

void unite(std::optional<Box>& sum, Box const& box) { sum = sum ? sum->united(box) : box; }

bool standBelowEachOther(Line const* upper, Line const* lower) {
    Frame const a = frameOf(upper->box, upper->turn);
    Frame const b = frameOf(lower->box, lower->turn);
    return upper->turn == lower->turn && a.bottom - b.top <= std::min(a.height(), b.height()) / 2;
}

/// One column has one order, whatever blocks its lines make.
std::vector<Line const*> inOrder(Layout const& layout) {
    std::vector<Line const*> asBlocks;
    for (Line const& line : layout.lines)
        asBlocks.push_back(&line);
    std::vector<Line const*> fromTop = asBlocks;
    std::stable_sort(fromTop.begin(), fromTop.end(), [](Line const* a, Line const* b) {
        return frameOf(a->box, a->turn).top < frameOf(b->box, b->turn).top;
    });
    bool const isColumn =
        std::adjacent_find(fromTop.begin(), fromTop.end(), [](Line const* a, Line const* b) {
            return !standBelowEachOther(a, b);
        }) == fromTop.end();
    return isColumn ? fromTop : asBlocks;
}

std::vector<Line const*> linesOf(std::vector<Block> const& blocks, Layout const& layout) {
    std::vector<Line const*> lines;
    for (Block const& block : blocks)
        for (std::size_t i = block.firstLine; i < block.endLine; ++i)
            lines.push_back(&layout.lines[i]);
    return lines;
}

/// From this ratio on a line is set smaller than another, as blocks have it.
bool isSmaller(int size, int other) { return size * 6LL <= other * 5LL; }

/// Whether the lower block goes on in the same column and print, with a few blank lines between them at most.
bool goesOnIn(Block const& upper, Block const& lower, Layout const& layout) {
    Line const& above = layout.lines[upper.endLine - 1];
    Line const& below = layout.lines[lower.firstLine];
    Frame const a = frameOf(upper.box, above.turn);
    Frame const b = frameOf(lower.box, below.turn);
    return above.turn == below.turn && !isSmaller(above.size, below.size) &&
           !isSmaller(below.size, above.size) && std::abs(a.start - b.start) <= above.size &&
           b.top >= a.bottom - above.size / 2 && b.top - a.bottom <= MOST_FREE_LINES * above.size;
}

using Blocks = std::vector<Block const*>;

/// The nearest block that the condition fits, as its distance in height tells; null without one.
template<typename Condition>
Block const* nearestBlock(Block const& block, Layout const& layout, Condition const& fits) {
    Block const* nearest = nullptr;
    for (Block const& other : layout.blocks)
        if (&other != &block && fits(other) &&
            (!nearest ||
             std::abs(other.box.top - block.box.top) < std::abs(nearest->box.top - block.box.top)))
            nearest = &other;
    return nearest;
}

/// Two and three blocks that stand below one another, one of which is the given one; the fewest first.
std::vector<Blocks> groupsAround(Block const& block, Layout const& layout) {
    auto const below = [&](Block const& upper) {
        return nearestBlock(upper, layout,
                            [&](Block const& other) { return goesOnIn(upper, other, layout); });
    };
    auto const above = [&](Block const& lower) {
        return nearestBlock(lower, layout,
                            [&](Block const& other) { return goesOnIn(other, lower, layout); });
    };
    Block const* const next = below(block);
    Block const* const last = above(block);
    std::vector<Blocks> groups{{&block, next}, {last, &block}};
    groups.push_back({last, &block, next});
    groups.push_back({&block, next, next ? below(*next) : nullptr});
    groups.push_back({last ? above(*last) : nullptr, last, &block});
    std::erase_if(groups, [](Blocks const& group) {
        return std::find(group.begin(), group.end(), nullptr) != group.end();
    });
    return groups;
}

} // namespace

ZoneText ZoneText::inside(Page const& page, Layout const& layout, Box const& location, ReadingOrder order) {
    ZoneText zone;
    Layout const inside = layOutInside(page, layout.spacing, location);
    bool const byRows = order == ReadingOrder::Rows;
    std::vector<Block> const blocks = byRows ? inside.blocks : byColumns(inside);
    for (Line const* const line : byRows ? inOrder(inside) : linesOf(blocks, inside))
        zone.addLine(page, *line);
    for (Block const& block : blocks)
        zone.addBlock(block);
    return zone;
}

ZoneText ZoneText::ofBlocks(Page const& page, Layout const& layout, std::vector<Block const*> const& blocks) {
    ZoneText zone;
    for (Block const* const block : blocks) {
        for (std::size_t i = block->firstLine; i < block->endLine; ++i)
            zone.addLine(page, layout.lines[i]);
        zone.addBlock(*block);
    }
    return zone;
}

ZoneText ZoneText::nearest(Page const& page, Layout const& layout, Point point) {
    Block const* const block = layout.nearestBlock(point);
    return block ? ofBlocks(page, layout, {block}) : ZoneText();
}

ZoneText ZoneText::nearestAddress(Page const& page, Layout const& layout, Point point) {
    ZoneText nearest = ZoneText::nearest(page, layout, point);
    if (nearest.lines_.empty() || looksLikePostalAddress(nearest.text()))
        return nearest;
    for (auto const& blocks : groupsAround(*layout.nearestBlock(point), layout)) {
        ZoneText joined = ofBlocks(page, layout, blocks);
        if (looksLikePostalAddress(joined.text()))
            return joined;
    }
    return nearest;
}

ZoneText ZoneText::given(std::string const& text) {
    ZoneText zone;
    for (std::size_t begin = 0; begin <= text.size();) {
        std::size_t const end = std::min(text.find('\n', begin), text.size());
        std::string_view const line =
            Base::firstCharacters(std::string_view(text).substr(begin, end - begin), MAX_LINE_LENGTH);
        if (!zone.lines_.empty())
            zone.text_ += '\n';
        zone.text_ += line;
        zone.lines_.push_back({{}, line.size(), 0, {}});
        begin = end + 1;
    }
    return zone;
}

void ZoneText::addBlock(Block const& block) {
    box_ = blocks_.empty() ? block.box : box_.united(block.box);
    blocks_.push_back(block.box);
}

void ZoneText::addLine(Page const& page, Line const& line) {
    if (!lines_.empty())
        text_ += '\n';
    lines_.push_back(lineOf(page, line));
}

/// Adds the line's words to the text and tells where they are.
ZoneText::TextLine ZoneText::lineOf(Page const& page, Line const& line) {
    TextLine result{{}, 0, line.size, frameOf(line.box, line.turn)};
    std::size_t charactersLeft = MAX_LINE_LENGTH;
    for (LineWord const& lineWord : line.words) {
        Word const& word = page.words[lineWord.word];
        bool const blank = !result.pieces.empty() && lineWord.blankBefore;
        if (charactersLeft <= (blank ? 1U : 0U))
            break;
        if (blank) {
            text_ += ' ';
            ++result.length;
            --charactersLeft;
        }
        std::string_view const text = Base::firstCharacters(word.text, charactersLeft);
        text_ += text;
        result.pieces.push_back({result.length, result.length + text.size(), &word});
        result.length += text.size();
        charactersLeft -= Base::characterCount(text);
    }
    return result;
}

ZoneText::LineRange ZoneText::linesAt(std::size_t offset, std::size_t length) const {
    std::size_t end = std::min(offset + length, text_.size());
    while (offset < end && text_[offset] == '\n')
        ++offset;
    while (offset < end && text_[end - 1] == '\n')
        --end;
    if (offset >= end)
        return {};

    LineRange range;
    std::size_t lineBegin = 0;
    for (std::size_t i = 0; i < lines_.size() && lineBegin < end; ++i) {
        std::size_t const lineEnd = lineBegin + lines_[i].length;
        if (lineEnd <= offset) {
            range.first = i + 1;
            range.textBegin = lineEnd + 1;
        }
        range.end = i + 1;
        range.textEnd = lineEnd;
        lineBegin = lineEnd + 1;
    }
    return range;
}

Stretch ZoneText::stretch(std::size_t offset, std::size_t length) const {
    Stretch result;
    if (offset > text_.size())
        return result;
    result.text = text_.substr(offset, length);
    std::size_t const end = offset + result.text.size();
    LineRange const range = linesAt(offset, result.text.size());
    std::optional<Box> all;
    std::size_t lineBegin = range.textBegin;
    for (std::size_t i = range.first; i < range.end; ++i) {
        std::optional<Box> ofLine;
        for (Piece const& piece : lines_[i].pieces) {
            std::size_t const from = std::max(offset, lineBegin + piece.begin) - lineBegin - piece.begin;
            std::size_t const pieceEnd = std::min(end, lineBegin + piece.end);
            if (pieceEnd > lineBegin + piece.begin + from)
                unite(ofLine, partOf(*piece.word, from, pieceEnd - lineBegin - piece.begin));
        }
        lineBegin += lines_[i].length + 1;
        if (!ofLine)
            continue;
        result.width = std::max(result.width, lengthAlong(*ofLine, lines_[i].pieces.front().word->turn));
        unite(all, *ofLine);
    }
    result.box = all.value_or(Box{});
    return result;
}

std::size_t ZoneText::countSmallerLinesAbove() const {
    constexpr std::size_t FEWEST_BELOW = 2;
    std::size_t count = 0;
    while (count < lines_.size() && !isSmaller(lines_.front().size, lines_[count].size))
        ++count;
    if (count + FEWEST_BELOW > lines_.size() || lines_[count].size == 0)
        return 0;
    Frame const& below = lines_[count].frame;
    bool const stand = std::all_of(lines_.begin(), lines_.begin() + static_cast<std::ptrdiff_t>(count),
                                   [&](TextLine const& line) {
                                       return isSmaller(line.size, lines_[count].size) &&
                                              line.frame.bottom <= below.top + below.height() / 2 &&
                                              line.frame.start < below.end && below.start < line.frame.end;
                                   });
    return stand && !isSmaller(lines_[count + 1].size, lines_[count].size) ? count : 0;
}

std::string ZoneText::cutSmallerLinesAbove() {
    std::size_t const count = countSmallerLinesAbove();
    if (count == 0)
        return {};
    std::size_t length = count - 1;
    for (std::size_t i = 0; i < count; ++i)
        length += lines_[i].length;
    return cutLines(0, length);
}

std::string ZoneText::cutLines(std::size_t offset, std::size_t length) {
    LineRange const range = linesAt(offset, length);
    if (range.first == range.end)
        return {};
    std::string const cut = text_.substr(range.textBegin, range.textEnd - range.textBegin);
    // The line break behind goes with the lines, that before them only where there is none behind.
    bool const isLast = range.end == lines_.size();
    std::size_t const begin = isLast && range.first > 0 ? range.textBegin - 1 : range.textBegin;
    text_.erase(begin, range.textEnd + (isLast ? 0 : 1) - begin);
    lines_.erase(lines_.begin() + static_cast<std::ptrdiff_t>(range.first),
                 lines_.begin() + static_cast<std::ptrdiff_t>(range.end));
    return cut;
}

std::vector<PlacedLine> ZoneText::placedLines() const {
    std::vector<PlacedLine> placed;
    std::size_t offset = 0;
    for (TextLine const& line : lines_) {
        if (!line.pieces.empty()) {
            Word const& first = *line.pieces.front().word;
            PlacedLine& one = placed.emplace_back(PlacedLine{offset, line.length, first.box, 0, first.turn});
            for (Piece const& piece : line.pieces) {
                one.box = one.box.united(piece.word->box);
                one.size = std::max(one.size, piece.word->size);
            }
        }
        offset += line.length + 1;
    }
    return placed;
}

} // namespace Reader
