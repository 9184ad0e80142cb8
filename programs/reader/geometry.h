#pragma once
// Places on a page: 1/100 mm from the top left corner of the page as it is shown.

#include <algorithm>
#include <cmath>

namespace Reader {

/// Points to 1/100 mm.
constexpr double POINT = 2540.0 / 72.0;

struct Point {
    int x = 0;
    int y = 0;

    friend bool operator==(Point const&, Point const&) = default;
};

struct Box {
    int left = 0;
    int top = 0;
    int right = 0;
    int bottom = 0;

    int width() const { return right - left; }
    int height() const { return bottom - top; }
    Point centre() const { return {left + width() / 2, top + height() / 2}; }
    /// The edges belong to the box.
    bool contains(Point point) const {
        return point.x >= left && point.x <= right && point.y >= top && point.y <= bottom;
    }
    /// 0 for a point inside.
    double distanceTo(Point point) const {
        double const dx = std::max({left - point.x, 0, point.x - right});
        double const dy = std::max({top - point.y, 0, point.y - bottom});
        return std::hypot(dx, dy);
    }
    /// The smallest box around both.
    Box united(Box const& other) const {
        return {std::min(left, other.left), std::min(top, other.top), std::max(right, other.right),
                std::max(bottom, other.bottom)};
    }

    friend bool operator==(Box const&, Box const&) = default;
};

/// Which way text runs on the page as it is shown, in quarter turns clockwise.
enum class Turn : unsigned char {
    Upright = 0,
    Down = 1,
    UpsideDown = 2,
    Up = 3,
};

inline bool runsAcross(Turn turn) { return turn == Turn::Upright || turn == Turn::UpsideDown; }

/// The extent of a box in the direction in which its text runs.
inline int lengthAlong(Box const& box, Turn turn) { return runsAcross(turn) ? box.width() : box.height(); }

} // namespace Reader
