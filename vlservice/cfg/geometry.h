#pragma once
// The plain geometry of pages: points and rectangles in 1/100 mm, with the origin at the page's top left
// corner.

#include "vlservice/export.h"
#include "vlservice/json/json.h"
#include "vlservice/json/json_form.h"

#include <cstdint>

namespace Cfg {

/// JSON: an object with "x" and "y", or an empty one when both are zero.
struct VLSERVICE_EXPORT Point {
    std::int32_t x = 0;
    std::int32_t y = 0;

    constexpr Point() = default;
    constexpr Point(int px, int py) : x(px), y(py) {} ///< in 1/100 mm
    /// Coordinates that are missing or no integers are 0, and so are all of the empty handle. Throws
    /// json::Exc when the node is no object.
    Point(json::Value const& node);

    constexpr bool isZeroes() const { return *this == Point(); } ///< as when it is not set
    json::Object serialize() const;
    static json::RecordKeys const& keys();

    friend constexpr bool operator==(Point const&, Point const&) = default;
};

/// JSON: an object with "left", "top", "right" and "bottom", or an empty one when all are zero.
struct VLSERVICE_EXPORT Rect {
    std::int32_t left = 0;
    std::int32_t top = 0;
    std::int32_t right = 0;
    std::int32_t bottom = 0;

    constexpr Rect() = default;
    constexpr Rect(int l, int t, int r, int b) : left(l), top(t), right(r), bottom(b) {} ///< 1/100 mm
    /// Reads as Point does.
    Rect(json::Value const& node);

    constexpr bool isZeroes() const { return *this == Rect(); } ///< as when it is not set
    json::Object serialize() const;
    static json::RecordKeys const& keys();

    friend constexpr bool operator==(Rect const&, Rect const&) = default;
};

} // namespace Cfg

/// As a setting a rectangle must be there: the empty handle is refused like everything that is no object.
template<>
struct json::Form<Cfg::Rect> {
    static Cfg::Rect read(Value const& node) { return node.toObject(); }
    static Value write(Cfg::Rect const& rect) { return rect.serialize(); }
    static KeyForm describe() { return {KeyType::Record, &Cfg::Rect::keys()}; }
};
