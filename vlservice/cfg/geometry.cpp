#include "vlservice/cfg/geometry.h"

#include "vlservice/json/json_record.h"

#include <tuple>

namespace Cfg {
namespace {

constexpr std::tuple POINT_KEYS{
    json::Key{"x", &Point::x}.alwaysWritten(),
    json::Key{"y", &Point::y}.alwaysWritten(),
};

constexpr std::tuple RECT_KEYS{
    json::Key{"left", &Rect::left}.alwaysWritten(),
    json::Key{"top", &Rect::top}.alwaysWritten(),
    json::Key{"right", &Rect::right}.alwaysWritten(),
    json::Key{"bottom", &Rect::bottom}.alwaysWritten(),
};

template<typename Shape, typename Keys>
void read(Shape& shape, json::Value const& node, Keys const& keys) {
    if (node)
        json::readKeys(keys, node.toObject(), shape);
}

template<typename Shape, typename Keys>
json::Object write(Shape const& shape, Keys const& keys) {
    json::Object object;
    if (!shape.isZeroes())
        json::writeKeys(keys, shape, object);
    return object;
}

} // namespace

Point::Point(json::Value const& node) { read(*this, node, POINT_KEYS); }

json::Object Point::serialize() const { return write(*this, POINT_KEYS); }

json::RecordKeys const& Point::keys() {
    static json::RecordKeys const keys{json::describeKeys(POINT_KEYS)};
    return keys;
}

Rect::Rect(json::Value const& node) { read(*this, node, RECT_KEYS); }

json::Object Rect::serialize() const { return write(*this, RECT_KEYS); }

json::RecordKeys const& Rect::keys() {
    static json::RecordKeys const keys{json::describeKeys(RECT_KEYS)};
    return keys;
}

} // namespace Cfg
