#pragma once
// The JSON documents that people and programs write for these programs, or read from them, as JSON schemas.

#include "vlservice/json/json.h"

#include <span>
#include <string_view>

namespace VlMail {

struct NamedSchema {
    char const* name;
    /// What it describes, for a list.
    char const* title;
    json::Object (*make)();
};

std::span<NamedSchema const> schemas();

/// Null when there is none of that name.
NamedSchema const* schemaNamed(std::string_view name);

/// The whole document with "$schema", "title" and the definitions that it needs.
json::Object documentOf(NamedSchema const& schema);

} // namespace VlMail
