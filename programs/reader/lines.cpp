#include "programs/reader/lines.h"

#include "programs/reader/blank_widths.h"
#include "programs/reader/letter_spacing.h"
#include "programs/reader/writing_direction.h"

#include <algorithm>
#include <map>
#include <numeric>
#include <optional>
#include <tuple>
#include <unordered_map>
#include <utility>

namespace Reader {
namespace {

// Lengths below are in font sizes where nothing else is said.

/// Words of one line overlap in height by this share of the lower one, which a raised "th" still does, and
/// ...
constexpr double MIN_OVERLAP = 0.5;
/// ... their bottom edges are at most this far apart, which keeps a large initial out of the lines beside it.
constexpr double MAX_BOTTOM_SHIFT = 0.5;
/// Kerned and slanted words may reach into each other this far.
constexpr double MAX_OVERPRINT = 0.3;
/// A copy of a word this near is the same word, printed twice to look bold or to cast a shadow.
constexpr double MAX_COPY_SHIFT = 0.1;
/// Words that are nearer touch: they are one word unless the document has a blank there.
constexpr double MIN_WORD_GAP = 0.1;

/// What whole numbers of 1/100 mm may take from a gap.
constexpr int ROUNDING = 1;

/// Larger fonts count as this large when a search is bounded, in 1/100 mm.
constexpr int LARGE_SIZE = 5000;
/// Candidates looked at for a word or a line, so that no page costs more than in proportion to its words.
constexpr int MAX_CANDIDATES = 64;
/// Lines that are looked up together before the finished ones among them are sought.
constexpr std::size_t MIN_CROWD = 32;

bool standsOnOneLine(Frame const& a, Frame const& b, int size) {
    int const overlap = std::min(a.bottom, b.bottom) - std::max(a.top, b.top);
    return overlap >= MIN_OVERLAP * std::min(a.height(), b.height()) &&
           std::abs(a.bottom - b.bottom) <= MAX_BOTTOM_SHIFT * size;
}

struct PlacedWord {
    Frame frame;
    std::size_t index = 0;
};

/// A line while words are added to it.
struct OpenLine {
    std::vector<PlacedWord> words;
    /// Of its largest word: a raised sign does not pull the line up.
    Frame core;
    int coreSize = 0;
};

/// How wide a gap inside a line may be, by font, in font sizes.
using GapLimits = std::vector<double>;

/// Joins the words of one turn to lines, from left to right.
class LineFinder {
public:
    LineFinder(Page const& page, std::vector<std::size_t> const& words, Turn turn) : page_(page) {
        for (std::size_t const i : words)
            if (page.words[i].turn == turn)
                words_.push_back({frameOf(page.words[i].box, turn), i});
        std::sort(words_.begin(), words_.end(),
                  [&](PlacedWord const& a, PlacedWord const& b) { return sortKey(a) < sortKey(b); });
        for (PlacedWord const& placed : words_)
            largestSize_ = std::max(largestSize_, std::min(word(placed).size, LARGE_SIZE));
    }

    std::vector<OpenLine> find(GapLimits const& limits) {
        lines_.clear();
        cells_.clear();
        reach_ = limits.empty() ? 0 : largestSize_ * *std::max_element(limits.begin(), limits.end());
        for (PlacedWord const& placed : words_)
            add(placed, limits);
        return std::move(lines_);
    }

private:
    Word const& word(PlacedWord const& placed) const { return page_.words[placed.index]; }

    std::tuple<int, int, int, std::string_view> sortKey(PlacedWord const& placed) const {
        return {placed.frame.start, placed.frame.bottom, placed.frame.end, word(placed).text};
    }

    void add(PlacedWord const& placed, GapLimits const& limits) {
        std::optional<std::size_t> const line = bestLine(placed, limits);
        if (!line) {
            open(placed);
            return;
        }
        OpenLine& found = lines_[*line];
        if (isCopy(word(found.words.back()), word(placed), found.words.back().frame, placed.frame))
            return;
        found.words.push_back(placed);
        if (word(placed).size > found.coreSize) {
            found.core = placed.frame;
            found.coreSize = word(placed).size;
        }
    }

    void open(PlacedWord const& placed) {
        cells_[cellOf(placed.frame.bottom)].lines.push_back(lines_.size());
        lines_.push_back({{placed}, placed.frame, word(placed).size});
    }

    static bool isCopy(Word const& a, Word const& b, Frame const& frameA, Frame const& frameB) {
        double const shift = MAX_COPY_SHIFT * std::max(a.size, b.size);
        return a.text == b.text && std::abs(frameA.start - frameB.start) <= shift &&
               std::abs(frameA.bottom - frameB.bottom) <= shift;
    }

    /// The line that the word goes on with: the nearest in height, then the nearest to its left.
    std::optional<std::size_t> bestLine(PlacedWord const& placed, GapLimits const& limits) {
        std::optional<std::size_t> best;
        std::pair<int, int> bestDistance;
        int const shift = static_cast<int>(MAX_BOTTOM_SHIFT * largestSize_);
        int const lastCell = cellOf(placed.frame.bottom + shift);
        for (int cell = cellOf(placed.frame.bottom - shift); cell <= lastCell; ++cell) {
            auto const found = cells_.find(cell);
            if (found == cells_.end())
                continue;
            dropPassedLines(found->second, placed.frame.start);
            std::vector<std::size_t> const& lines = found->second.lines;
            int left = MAX_CANDIDATES;
            for (std::size_t i = lines.size(); i-- > 0 && left-- > 0;) {
                OpenLine const& line = lines_[lines[i]];
                if (!goesOn(line, placed, limits))
                    continue;
                std::pair const distance{std::abs(line.core.bottom - placed.frame.bottom),
                                         placed.frame.start - line.words.back().frame.end};
                if (!best || distance < bestDistance) {
                    best = lines[i];
                    bestDistance = distance;
                }
            }
        }
        return best;
    }

    bool goesOn(OpenLine const& line, PlacedWord const& placed, GapLimits const& limits) const {
        Word const& last = word(line.words.back());
        Word const& next = word(placed);
        int const size = std::max(last.size, next.size);
        if (!standsOnOneLine(line.core, placed.frame, std::max(line.coreSize, next.size)))
            return false;
        double const gap = placed.frame.start - line.words.back().frame.end;
        if (gap < -MAX_OVERPRINT * size)
            return isCopy(last, next, line.words.back().frame, placed.frame);
        return gap <= size * std::max(limits[last.font], limits[next.font]) + ROUNDING;
    }

    /// Lines whose bottom edges are near each other.
    struct Cell {
        std::vector<std::size_t> lines;
        std::size_t crowded = MIN_CROWD;
    };

    /// Words come from left to right: a line that is too far behind gets no more of them.
    void dropPassedLines(Cell& cell, int start) const {
        if (cell.lines.size() < cell.crowded)
            return;
        std::erase_if(cell.lines,
                      [&](std::size_t line) { return lines_[line].words.back().frame.end + reach_ < start; });
        cell.crowded = std::max(MIN_CROWD, 2 * cell.lines.size());
    }

    /// Lines are looked up by their bottom edge, in steps of 10 mm.
    static int cellOf(int bottom) { return bottom >= 0 ? bottom / 1000 : bottom / 1000 - 1; }

    Page const& page_;
    std::vector<PlacedWord> words_;
    int largestSize_ = 1;
    double reach_ = 0;
    std::vector<OpenLine> lines_;
    std::unordered_map<int, Cell> cells_;
};

void sampleGaps(Page const& page, std::vector<OpenLine> const& lines, BlankWidths& blanks) {
    for (OpenLine const& line : lines)
        for (std::size_t i = 1; i < line.words.size(); ++i) {
            Word const& before = page.words[line.words[i - 1].index];
            Word const& word = page.words[line.words[i].index];
            double const gap = line.words[i].frame.start - line.words[i - 1].frame.end;
            if (before.font == word.font && gap > MIN_WORD_GAP * word.size)
                blanks.addGap(word.font, gap / word.size);
        }
}

/// The size of most of the line's characters.
int mainSize(Page const& page, OpenLine const& line) {
    std::map<int, std::size_t> charactersOfSizes;
    int main = 0;
    std::size_t most = 0;
    for (PlacedWord const& placed : line.words) {
        Word const& word = page.words[placed.index];
        std::size_t const characters = charactersOfSizes[word.size] += word.text.size();
        if (characters > most) {
            most = characters;
            main = word.size;
        }
    }
    return main;
}

/// Whether the word at `i` and the one before it have a blank between them.
bool isApart(Page const& page, OpenLine const& open, std::size_t i, double minWordGap) {
    Word const& before = page.words[open.words[i - 1].index];
    int const size = std::max(before.size, page.words[open.words[i].index].size);
    int const gap = open.words[i].frame.start - open.words[i - 1].frame.end;
    return before.blankBehind || gap > minWordGap * size;
}

std::vector<SetWord> asSet(Page const& page, OpenLine const& open) {
    std::vector<SetWord> words;
    for (std::size_t i = 0; i < open.words.size(); ++i) {
        Word const& word = page.words[open.words[i].index];
        int const gap = i == 0 ? 0 : open.words[i].frame.start - open.words[i - 1].frame.end;
        words.push_back({word.text, gap, word.size, word.font});
    }
    return words;
}

/// The words from left to right.
std::vector<LineWord> wordsOf(Page const& page, OpenLine const& open, double minWordGap) {
    std::vector<bool> const isSpaced = belongsToWordBefore(asSet(page, open));
    std::vector<LineWord> words;
    for (std::size_t i = 0; i < open.words.size(); ++i)
        words.push_back({open.words[i].index, i > 0 && !isSpaced[i] && isApart(page, open, i, minWordGap)});
    return words;
}

std::vector<LineWord> asRead(Page const& page, std::vector<LineWord> words) {
    std::vector<std::string_view> texts;
    for (LineWord const& word : words)
        texts.push_back(page.words[word.word].text);
    if (page.isTyped || std::none_of(texts.begin(), texts.end(), isFromRightToLeft))
        return words;
    std::vector<std::size_t> const order = readingOrderOf(texts);
    std::vector<LineWord> read;
    for (std::size_t i = 0; i < order.size(); ++i) {
        // What stands between two words stands in front of the one on the right; others were never
        // neighbours.
        std::size_t const right = i > 0 ? std::max(order[i - 1], order[i]) : 0;
        bool const areNeighbours = i > 0 && order[i - 1] + order[i] + 1 == 2 * right;
        read.push_back({words[order[i]].word, i > 0 && (!areNeighbours || words[right].blankBefore)});
    }
    return read;
}

Line closed(Page const& page, OpenLine const& open, Turn turn, double minWordGap) {
    Line line{asRead(page, wordsOf(page, open, minWordGap)), page.words[open.words.front().index].box,
              mainSize(page, open), turn};
    for (PlacedWord const& placed : open.words)
        line.box = line.box.united(page.words[placed.index].box);
    return line;
}

} // namespace

Spacing spacingOf(Page const& page, LayoutRules const& rules) {
    std::vector<std::size_t> words(page.words.size());
    std::iota(words.begin(), words.end(), std::size_t{0});
    // This search knows no fonts: it is there to learn how wide their blanks are.
    GapLimits const wide(page.fonts.size(), BlankWidths::MAX_GAP);
    BlankWidths blanks(page);
    for (Turn turn : TURNS)
        sampleGaps(page, LineFinder(page, words, turn).find(wide), blanks);
    Spacing spacing{{}, MIN_WORD_GAP * (1 + rules.spaceAdjustPerc / 100.0), rules.maxLineDistance};
    for (std::size_t font = 0; font < page.fonts.size(); ++font)
        spacing.gapLimits.push_back(rules.maxSpaces * blanks.of(font));
    return spacing;
}

std::vector<Line> findLines(Page const& page, std::vector<std::size_t> const& words, Spacing const& spacing) {
    std::vector<Line> lines;
    for (Turn turn : TURNS)
        for (OpenLine const& open : LineFinder(page, words, turn).find(spacing.gapLimits))
            lines.push_back(closed(page, open, turn, spacing.minWordGap));
    return lines;
}

std::string textOf(Page const& page, Line const& line) {
    std::string text;
    for (LineWord const& word : line.words) {
        if (word.blankBefore)
            text += ' ';
        text += page.words[word.word].text;
    }
    return text;
}

} // namespace Reader
