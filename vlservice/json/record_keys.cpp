#include "vlservice/json/record_keys.h"

#include <algorithm>

namespace json {

KeyRow const* RecordKeys::find(std::string_view name) const {
    auto const found = std::ranges::find(rows, name, &KeyRow::name);
    return found == rows.end() ? nullptr : &*found;
}

} // namespace json
