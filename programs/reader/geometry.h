#pragma once
// Places on a page: 1/100 mm from the top left corner of the page as it is shown.

#include "vlservice/cfg/geometry.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdint>
#include <limits>
#include <numeric>

namespace Reader {

constexpr double INCH = 2540;
/// The unit of PDFs.
constexpr double PDF_POINT = INCH / 72;

using Cfg::Point;

struct Box {
    int left = 0;
    int top = 0;
    int right = 0;
    int bottom = 0;

    int width() const { return difference(left, right); }
    int height() const { return difference(top, bottom); }
    Point centre() const { return {std::midpoint(left, right), std::midpoint(top, bottom)}; }
    /// The edges belong to the box.
    bool contains(Point point) const {
        return point.x >= left && point.x <= right && point.y >= top && point.y <= bottom;
    }
    /// 0 for a point inside.
    double distanceTo(Point point) const {
        return std::hypot(distance(left, right, point.x), distance(top, bottom, point.y));
    }
    /// Edges that no int can tell end at the last one.
    Box movedBy(Point by) const {
        return {sum(left, by.x), sum(top, by.y), sum(right, by.x), sum(bottom, by.y)};
    }
    /// The smallest box around both.
    Box united(Box const& other) const {
        return {std::min(left, other.left), std::min(top, other.top), std::max(right, other.right),
                std::max(bottom, other.bottom)};
    }

    friend bool operator==(Box const&, Box const&) = default;

private:
    /// Edges and points come from settings and may be anywhere: their differences need not fit an int.
    static int difference(int from, int to) {
        constexpr std::int64_t MOST = std::numeric_limits<int>::max();
        return static_cast<int>(std::clamp(std::int64_t{to} - from, -MOST, MOST));
    }
    static int sum(int a, int b) {
        using Limits = std::numeric_limits<int>;
        return static_cast<int>(std::clamp<std::int64_t>(std::int64_t{a} + b, Limits::min(), Limits::max()));
    }
    static double distance(double from, double to, double at) { return std::max({from - at, 0.0, at - to}); }
};

/// Which way text runs on the page as it is shown, in quarter turns clockwise.
enum class Turn : unsigned char {
    Upright = 0,
    Down = 1,
    UpsideDown = 2,
    Up = 3,
};

inline constexpr std::array TURNS = {Turn::Upright, Turn::Down, Turn::UpsideDown, Turn::Up};

inline bool runsAcross(Turn turn) { return turn == Turn::Upright || turn == Turn::UpsideDown; }

/// The extent of a box in the direction in which its text runs.
inline int lengthAlong(Box const& box, Turn turn) { return runsAcross(turn) ? box.width() : box.height(); }

/// A box turned so that its text runs from left to right and its lines from top to bottom.
struct Frame {
    int start = 0;
    int end = 0;
    int top = 0;
    int bottom = 0;

    int height() const { return std::max(bottom - top, 1); }
};

Frame frameOf(Box const& box, Turn turn);

/// The part of a box that its text takes from one share of its length to another, both from 0 to 1.
Box partAlong(Box const& box, Turn turn, double from, double to);

} // namespace Reader
