#include "programs/vlmail/explain/near_miss_change.h"

namespace VlMail::Change {

json::Object setting(char const* of, std::vector<std::string> const& path, json::Value const& value) {
    json::Array steps;
    for (std::string const& step : path)
        steps.append(step);
    json::Object change{{OF, of}, {PATH, steps}};
    if (value)
        change.set(VALUE, value);
    return change;
}

json::Object pattern(std::string const& pattern) { return setting(FIELD, {"value_extract"}, pattern); }
json::Object before(std::string const& field) { return {{OF, FIELD}, {BEFORE, field}}; }
json::Object toZone(std::string const& zone) { return {{OF, FIELD}, {TO_ZONE, zone}}; }
json::Object toOwnZone(json::Object const& where) { return {{OF, FIELD}, {OWN_ZONE, where}}; }

json::Object toOwnZone(json::Object const& where, int page) {
    json::Object change = toOwnZone(where);
    change.set(PAGE, page);
    return change;
}

json::Object location(Reader::Box const& box) {
    return {{"left", box.left}, {"top", box.top}, {"right", box.right}, {"bottom", box.bottom}};
}

json::Object point(Reader::Point point) { return {{"x", point.x}, {"y", point.y}}; }

} // namespace VlMail::Change
