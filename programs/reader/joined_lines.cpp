#include "programs/reader/joined_lines.h"

#include <cstdint>
#include <optional>
#include <tuple>
#include <unordered_map>
#include <utility>

namespace Reader {
namespace {

/// Neighbours overlap in height, and a line and the one below it in width, by this share of the smaller one.
constexpr double MIN_OVERLAP = 0.5;
/// The free space between a line and the one below it, in font sizes: a line may be left empty.
constexpr double MAX_DISTANCE = 2.0;
/// Boxes of lines that are set tightly reach into each other by this share of a font size.
constexpr double MAX_REACH = 0.3;
/// Of one row; more columns are a table.
constexpr std::size_t MAX_ROW = 4;

/// Lines looked at for a neighbour, so that no page costs more than in proportion to its lines.
constexpr std::size_t MAX_CANDIDATES = 64;
/// Lines are looked up by their height on the page, in steps of 10 mm ...
constexpr int CELL = 1000;
/// ... and those that are higher than letters ever are not at all.
constexpr int MAX_CELLS = 64;

int cellOf(int height) { return height >= 0 ? height / CELL : height / CELL - 1; }

int overlapAcross(Frame const& a, Frame const& b) {
    return std::min(a.bottom, b.bottom) - std::max(a.top, b.top);
}

int overlapAlong(Frame const& a, Frame const& b) {
    return std::min(a.end, b.end) - std::max(a.start, b.start);
}

bool isAtHeightOf(Frame const& a, Frame const& b) {
    return overlapAcross(a, b) >= MIN_OVERLAP * std::min(a.height(), b.height());
}

bool isInColumnOf(Frame const& a, Frame const& b) {
    return overlapAlong(a, b) >= MIN_OVERLAP * std::max(1, std::min(a.end - a.start, b.end - b.start));
}

/// A neighbour and how far away it is.
struct Neighbour {
    std::size_t line = 0;
    int distance = 0;
};

/// The lines of one turn.
class Neighbourhood {
public:
    Neighbourhood(std::vector<PlacedLine> const& lines, Turn turn) : lines_(lines), frames_(lines.size()) {
        for (std::size_t i = 0; i < lines.size(); ++i)
            if (lines[i].turn == turn)
                add(i, frameOf(lines[i].box, turn));
        for (auto& [cell, members] : cells_)
            std::sort(members.begin(), members.end(), [&](std::size_t a, std::size_t b) {
                return std::tie(frames_[a].start, a) < std::tie(frames_[b].start, b);
            });
    }

    std::vector<std::size_t> const& members() const { return members_; }

    std::optional<Neighbour> rightOf(std::size_t line) const {
        Frame const& frame = frames_[line];
        int const from = frame.end - reach(line);
        Nearest nearest;
        for (int cell = cellOf(frame.top); cell <= cellOf(frame.bottom); ++cell) {
            auto const& [begin, end] = linesIn(cell);
            auto at = std::lower_bound(
                begin, end, from, [&](std::size_t one, int start) { return frames_[one].start < start; });
            for (std::size_t left = MAX_CANDIDATES; at != end && left > 0; ++at, --left)
                if (*at != line && isAtHeightOf(frame, frames_[*at])) {
                    nearest.offer({*at, frames_[*at].start - frame.end}, overlapAcross(frame, frames_[*at]));
                    break;
                }
        }
        return nearest.get();
    }

    std::optional<Neighbour> below(std::size_t line) const {
        Frame const& frame = frames_[line];
        int const farthest = frame.bottom + static_cast<int>(MAX_DISTANCE * lines_[line].size);
        Nearest nearest;
        for (int cell = cellOf(frame.bottom - reach(line)); cell <= cellOf(farthest); ++cell) {
            auto const& [begin, end] = linesIn(cell);
            auto at = std::lower_bound(begin, end, frame.end, [&](std::size_t one, int start) {
                return frames_[one].start < start;
            });
            for (std::size_t left = MAX_CANDIDATES; at != begin && left > 0; --left) {
                Frame const& lower = frames_[*--at];
                if (*at != line && lower.top >= frame.bottom - reach(line) && lower.top <= farthest &&
                    isInColumnOf(frame, lower))
                    nearest.offer({*at, lower.top - frame.bottom}, -std::abs(frame.start - lower.start));
            }
        }
        return nearest.get();
    }

private:
    /// Of two at the same distance the better one, then the first.
    class Nearest {
    public:
        void offer(Neighbour neighbour, int worth) {
            if (best_ && std::tuple(best_->distance, -worth_, best_->line) <=
                             std::tuple(neighbour.distance, -worth, neighbour.line))
                return;
            best_ = neighbour;
            worth_ = worth;
        }
        std::optional<Neighbour> get() const { return best_; }

    private:
        std::optional<Neighbour> best_;
        int worth_ = 0;
    };

    using Lines = std::vector<std::size_t>;

    void add(std::size_t line, Frame const& frame) {
        if (frame.bottom < frame.top || cellOf(frame.bottom) - cellOf(frame.top) > MAX_CELLS ||
            lines_[line].size > MAX_CELLS * CELL)
            return;
        frames_[line] = frame;
        members_.push_back(line);
        for (int cell = cellOf(frame.top); cell <= cellOf(frame.bottom); ++cell)
            cells_[cell].push_back(line);
    }

    std::pair<Lines::const_iterator, Lines::const_iterator> linesIn(int cell) const {
        static Lines const none;
        auto const found = cells_.find(cell);
        Lines const& lines = found == cells_.end() ? none : found->second;
        return {lines.begin(), lines.end()};
    }

    int reach(std::size_t line) const { return static_cast<int>(MAX_REACH * lines_[line].size); }

    std::vector<PlacedLine> const& lines_;
    std::vector<Frame> frames_;
    Lines members_;
    std::unordered_map<int, Lines> cells_;
};

/// The joins, each with what it is sorted by.
class Joins {
public:
    void addRow(Neighbourhood const& lines, std::size_t first) {
        std::vector<std::size_t> row{first};
        std::int64_t distance = 0;
        while (row.size() < MAX_ROW) {
            std::optional<Neighbour> const next = lines.rightOf(row.back());
            if (!next || std::find(row.begin(), row.end(), next->line) != row.end())
                return;
            row.push_back(next->line);
            distance += next->distance;
            add({Joint::Right, row}, distance);
        }
    }

    void addColumn(Neighbourhood const& lines, std::size_t first) {
        if (std::optional<Neighbour> const next = lines.below(first))
            add({Joint::Below, {first, next->line}}, next->distance);
    }

    std::vector<LineJoin> take() {
        std::stable_sort(joins_.begin(), joins_.end(),
                         [](Ranked const& a, Ranked const& b) { return a.rank < b.rank; });
        std::vector<LineJoin> joins;
        for (Ranked& ranked : joins_)
            joins.push_back(std::move(ranked.join));
        return joins;
    }

private:
    using Rank = std::tuple<Joint, std::size_t, std::int64_t, std::size_t>;
    struct Ranked {
        Rank rank;
        LineJoin join;
    };

    void add(LineJoin join, std::int64_t distance) {
        Rank const rank(join.joint, join.lines.size(), distance, join.lines.front());
        joins_.push_back({rank, std::move(join)});
    }

    std::vector<Ranked> joins_;
};

} // namespace

std::vector<LineJoin> joinsOf(std::vector<PlacedLine> const& lines) {
    Joins joins;
    for (Turn const turn : TURNS) {
        Neighbourhood const neighbourhood(lines, turn);
        for (std::size_t const line : neighbourhood.members()) {
            joins.addRow(neighbourhood, line);
            joins.addColumn(neighbourhood, line);
        }
    }
    return joins.take();
}

} // namespace Reader
