#include "programs/reader/layout.h"

#include "programs/reader/letters_of.h"

#include <array>
#include <limits>
#include <map>
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
/// The width of a blank is the median of the gaps up to MAX_BLANK_SAMPLE, within these limits: justified text
/// stretches it.
constexpr double MIN_BLANK = 1.0 / 3.0;
constexpr double MAX_BLANK = 0.6;
constexpr double MAX_BLANK_SAMPLE = 1.0;
/// In typed text a blank is as wide as a letter. All letters of a font are equally wide when the average
/// letters of so many words differ by no more than this share.
constexpr std::size_t MIN_TYPED_WORDS = 3;
constexpr std::size_t MIN_TYPED_LETTERS = 3;
constexpr double MAX_TYPED_SPREAD = 0.01;
/// Lines that are nearer stand side by side and are never of one block.
constexpr double MIN_LINE_DISTANCE = 0.3;
/// From this ratio on, two sizes are different: an address and the sender's small line above it.
constexpr double OTHER_SIZE = 1.2;

/// What whole numbers of 1/100 mm may take from a gap.
constexpr int ROUNDING = 1;

/// Larger fonts count as this large when a search is bounded, in 1/100 mm.
constexpr int LARGE_SIZE = 5000;
/// Candidates looked at for a word or a line, so that no page costs more than in proportion to its words.
constexpr int MAX_CANDIDATES = 64;
/// Lines that are looked up together before the finished ones among them are sought.
constexpr std::size_t MIN_CROWD = 32;

constexpr std::array TURNS = {Turn::Upright, Turn::Down, Turn::UpsideDown, Turn::Up};

/// A box turned so that its text runs from left to right and its lines from top to bottom.
struct Frame {
    int start = 0;
    int end = 0;
    int top = 0;
    int bottom = 0;

    int height() const { return std::max(bottom - top, 1); }
};

Frame frameOf(Box const& box, Turn turn) {
    switch (turn) {
    case Turn::Upright:
        break;
    case Turn::Down:
        return {box.top, box.bottom, -box.right, -box.left};
    case Turn::UpsideDown:
        return {-box.right, -box.left, -box.bottom, -box.top};
    case Turn::Up:
        return {-box.bottom, -box.top, box.left, box.right};
    }
    return {box.left, box.right, box.top, box.bottom};
}

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
    LineFinder(Page const& page, Turn turn) : page_(page) {
        for (std::size_t i = 0; i < page.words.size(); ++i)
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
        reach_ = largestSize_ * *std::max_element(limits.begin(), limits.end());
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

/// What tells how wide a font's blank is, in font sizes.
struct FontSample {
    std::vector<double> gaps;
    std::size_t words = 0;
    double narrowest = std::numeric_limits<double>::infinity();
    double widest = 0;

    void addWord(double letterWidth) {
        ++words;
        narrowest = std::min(narrowest, letterWidth);
        widest = std::max(widest, letterWidth);
    }
    double blank() {
        if (words >= MIN_TYPED_WORDS && widest - narrowest <= MAX_TYPED_SPREAD * widest)
            return std::clamp(widest, MIN_BLANK, MAX_BLANK);
        if (gaps.empty())
            return MIN_BLANK;
        auto const middle = gaps.begin() + static_cast<std::ptrdiff_t>(gaps.size() / 2);
        std::nth_element(gaps.begin(), middle, gaps.end());
        return std::clamp(*middle, MIN_BLANK, MAX_BLANK);
    }
};

void sampleWords(Page const& page, std::vector<FontSample>& samples) {
    for (Word const& word : page.words)
        if (std::size_t const letters = countLetters(word.text); letters >= MIN_TYPED_LETTERS)
            samples[word.font].addWord(lengthAlong(word.box, word.turn) /
                                       (static_cast<double>(letters) * word.size));
}

void sampleGaps(Page const& page, std::vector<OpenLine> const& lines, std::vector<FontSample>& samples) {
    for (OpenLine const& line : lines)
        for (std::size_t i = 1; i < line.words.size(); ++i) {
            Word const& before = page.words[line.words[i - 1].index];
            Word const& word = page.words[line.words[i].index];
            double const gap = line.words[i].frame.start - line.words[i - 1].frame.end;
            if (before.font == word.font && gap > MIN_WORD_GAP * word.size)
                samples[word.font].gaps.push_back(gap / word.size);
        }
}

/// The size of most of the line's letters.
int mainSize(Page const& page, OpenLine const& line) {
    std::map<int, std::size_t> lettersOfSizes;
    int main = 0;
    std::size_t most = 0;
    for (PlacedWord const& placed : line.words) {
        Word const& word = page.words[placed.index];
        std::size_t const letters = lettersOfSizes[word.size] += word.text.size();
        if (letters > most) {
            most = letters;
            main = word.size;
        }
    }
    return main;
}

Line closed(Page const& page, OpenLine const& open, Turn turn, double minWordGap) {
    Line line;
    line.turn = turn;
    line.size = mainSize(page, open);
    line.box = page.words[open.words.front().index].box;
    for (std::size_t i = 0; i < open.words.size(); ++i) {
        std::size_t const index = open.words[i].index;
        bool blankBefore = false;
        if (i > 0) {
            Word const& before = page.words[open.words[i - 1].index];
            int const size = std::max(before.size, page.words[index].size);
            int const gap = open.words[i].frame.start - open.words[i - 1].frame.end;
            blankBefore = before.blankBehind || gap > minWordGap * size;
        }
        line.words.push_back({index, blankBefore});
        line.box = line.box.united(page.words[index].box);
    }
    return line;
}

std::vector<Line> findLines(Page const& page, LayoutRules const& rules) {
    // The first search knows no fonts: it is there to learn how wide their blanks are.
    std::vector<FontSample> samples(page.fonts.size());
    sampleWords(page, samples);
    std::vector<LineFinder> finders;
    for (Turn turn : TURNS) {
        finders.emplace_back(page, turn);
        sampleGaps(page, finders.back().find(GapLimits(samples.size(), MAX_BLANK_SAMPLE)), samples);
    }
    GapLimits limits;
    for (std::size_t font = 0; font < samples.size(); ++font) {
        double const known = page.fonts[font].blank;
        limits.push_back(rules.maxSpaces * (known > 0 ? known : samples[font].blank()));
    }
    double const minWordGap = MIN_WORD_GAP * (1 + rules.spaceAdjustPerc / 100.0);

    std::vector<Line> lines;
    for (std::size_t i = 0; i < finders.size(); ++i)
        for (OpenLine const& open : finders[i].find(limits))
            lines.push_back(closed(page, open, TURNS[i], minWordGap));
    return lines;
}

/// A line among those of its turn, from top to bottom.
struct PlacedLine {
    Frame frame;
    std::size_t line = 0;
    std::optional<std::size_t> next;
    bool hasBefore = false;
};

bool continues(Line const& upper, Frame const& upperFrame, Line const& lower, Frame const& lowerFrame,
               double maxLineDistance) {
    auto const [smaller, larger] = std::minmax(upper.size, lower.size);
    double const distance = lowerFrame.bottom - upperFrame.bottom;
    return larger < OTHER_SIZE * smaller && distance >= MIN_LINE_DISTANCE * larger &&
           distance <= maxLineDistance * larger && lowerFrame.start < upperFrame.end &&
           upperFrame.start < lowerFrame.end;
}

/// Gives each line at most one line below it, the nearest: columns under one heading stay apart.
void chain(std::vector<PlacedLine>& placed, std::vector<Line> const& lines, double maxLineDistance) {
    // Lines without one below them yet, in the order of `placed`.
    std::vector<std::size_t> tails;
    for (std::size_t i = 0; i < placed.size(); ++i) {
        std::size_t best = tails.size();
        std::pair<int, int> bestDistance;
        int left = MAX_CANDIDATES;
        for (std::size_t t = tails.size(); t-- > 0 && left-- > 0;) {
            PlacedLine const& upper = placed[tails[t]];
            if (!continues(lines[upper.line], upper.frame, lines[placed[i].line], placed[i].frame,
                           maxLineDistance))
                continue;
            std::pair const distance{placed[i].frame.bottom - upper.frame.bottom,
                                     std::abs(placed[i].frame.start - upper.frame.start)};
            if (best == tails.size() || distance < bestDistance) {
                best = t;
                bestDistance = distance;
            }
        }
        if (best < tails.size()) {
            placed[tails[best]].next = i;
            placed[i].hasBefore = true;
            tails.erase(tails.begin() + static_cast<std::ptrdiff_t>(best));
        }
        tails.push_back(i);
        if (tails.size() > 2 * MAX_CANDIDATES)
            tails.erase(tails.begin(), tails.end() - MAX_CANDIDATES);
    }
}

/// A block's lines by their position among all lines.
using Chain = std::vector<std::size_t>;

std::vector<Chain> findBlocks(std::vector<Line> const& lines, Turn turn, double maxLineDistance) {
    std::vector<PlacedLine> placed;
    for (std::size_t i = 0; i < lines.size(); ++i)
        if (lines[i].turn == turn)
            placed.push_back({frameOf(lines[i].box, turn), i, {}, false});
    std::sort(placed.begin(), placed.end(), [](PlacedLine const& a, PlacedLine const& b) {
        return std::tie(a.frame.bottom, a.frame.start, a.frame.end) <
               std::tie(b.frame.bottom, b.frame.start, b.frame.end);
    });
    chain(placed, lines, maxLineDistance);

    std::vector<Chain> blocks;
    for (PlacedLine const& first : placed) {
        if (first.hasBefore)
            continue;
        blocks.push_back({first.line});
        for (PlacedLine const* at = &first; at->next;) {
            at = &placed[*at->next];
            blocks.back().push_back(at->line);
        }
    }
    return blocks;
}

Box boxOf(std::vector<Line> const& lines, Chain const& block) {
    Box box = lines[block.front()].box;
    for (std::size_t line : block)
        box = box.united(lines[line].box);
    return box;
}

Turn mainTurnOf(Page const& page) {
    std::array<std::size_t, TURNS.size()> letters{};
    for (Word const& word : page.words)
        letters[static_cast<std::size_t>(word.turn)] += word.text.size();
    return static_cast<Turn>(std::max_element(letters.begin(), letters.end()) - letters.begin());
}

} // namespace

Layout layOut(Page const& page, LayoutRules const& rules) {
    Layout layout;
    if (page.words.empty())
        return layout;
    layout.mainTurn = mainTurnOf(page);
    std::vector<Line> lines = findLines(page, rules);

    std::vector<std::pair<Block, Chain>> blocks;
    for (Turn turn : TURNS)
        for (Chain& chain : findBlocks(lines, turn, rules.maxLineDistance)) {
            Block const block{boxOf(lines, chain), 0, 0, turn};
            blocks.emplace_back(block, std::move(chain));
        }
    auto const readingOrder = [&](Block const& block) {
        return std::tuple(block.turn != layout.mainTurn, block.box.top, block.box.left, block.box.bottom,
                          block.box.right);
    };
    std::stable_sort(blocks.begin(), blocks.end(), [&](auto const& a, auto const& b) {
        return readingOrder(a.first) < readingOrder(b.first);
    });
    for (auto& [block, chain] : blocks) {
        block.firstLine = layout.lines.size();
        for (std::size_t line : chain)
            layout.lines.push_back(std::move(lines[line]));
        block.endLine = layout.lines.size();
        layout.blocks.push_back(block);
    }
    return layout;
}

Block const* Layout::nearestBlock(Point point) const {
    auto const nearestLine = [&](Block const& block) {
        double nearest = std::numeric_limits<double>::infinity();
        for (std::size_t i = block.firstLine; i < block.endLine; ++i)
            nearest = std::min(nearest, lines[i].box.distanceTo(point));
        return nearest;
    };
    Block const* best = nullptr;
    std::pair<double, double> bestDistance;
    for (Block const& block : blocks) {
        if (block.turn != mainTurn)
            continue;
        // Boxes of blocks may overlap, their lines hardly.
        std::pair const distance{block.box.distanceTo(point), nearestLine(block)};
        if (!best || distance < bestDistance) {
            best = &block;
            bestDistance = distance;
        }
    }
    return best;
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
