#pragma once
// The keys that a record does not know: kept in one JSON value on reading, and written back behind its own
// keys.

#include "vlservice/json/json.h"

#include <utility>

namespace Cfg {

/// The members of `object` whose key nobody has claimed, their values shared; the empty handle when there are
/// none.
template<typename IsClaimed>
json::Value additionalKeys(json::Object const& object, IsClaimed isClaimed) {
    json::Object additional;
    for (auto const& [key, value] : object)
        if (!isClaimed(key))
            additional.set(key, value);
    return additional.empty() ? json::Value() : json::Value(std::move(additional));
}

/// Sets every member of `additional` in `into`, where it replaces a member of the same key.
/// Throws json::Exc when `additional` holds something that is no object.
inline void addKeys(json::Value const& additional, json::Object& into) {
    if (!additional)
        return;
    for (auto const& [key, value] : additional.toObject())
        into.set(key, value);
}

} // namespace Cfg
