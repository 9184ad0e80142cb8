#pragma once
// What docs/ say of the keys of JSON documents, where editors show it.

#include "programs/base/json_schema.h"

#include <string_view>
#include <vector>

namespace VlMail {

/// Tables of a page, by the beginnings of the headings that they stand below.
struct KeyTables {
    std::string_view page;
    std::vector<std::string_view> headings;
};

/// The schema of an object with a "description" of each of its members that the tables tell of. Throws
/// std::out_of_range when there is no such page.
json::Object described(json::Object const& object, KeyTables const& tables);

} // namespace VlMail
