#include "vlservice/cfg/geometry.h"

#include <utility>

namespace Cfg {
namespace {

constexpr std::pair<char const*, std::int32_t Point::*> POINT_KEYS[] = {{"x", &Point::x}, {"y", &Point::y}};

constexpr std::pair<char const*, std::int32_t Rect::*> RECT_KEYS[] = {
    {"left", &Rect::left}, {"top", &Rect::top}, {"right", &Rect::right}, {"bottom", &Rect::bottom}};

template<typename Shape, typename Keys>
void read(Shape& shape, json::Value const& node, Keys const& keys) {
    if (!node)
        return;
    json::Object const& object = node.toObject();
    for (auto const& [key, coordinate] : keys)
        shape.*coordinate = static_cast<std::int32_t>(object.get(key).intOrZero());
}

template<typename Shape, typename Keys>
json::Object write(Shape const& shape, Keys const& keys) {
    json::Object object;
    if (shape.isZeroes())
        return object;
    for (auto const& [key, coordinate] : keys)
        object.set(key, shape.*coordinate);
    return object;
}

} // namespace

Point::Point(json::Value const& node) { read(*this, node, POINT_KEYS); }

json::Object Point::serialize() const { return write(*this, POINT_KEYS); }

Rect::Rect(json::Value const& node) { read(*this, node, RECT_KEYS); }

json::Object Rect::serialize() const { return write(*this, RECT_KEYS); }

} // namespace Cfg
