#pragma once
// The questions that one command carries: each is an object, and its key "query" says which it is.

#include "vlservice/json/json.h"

#include <string>

namespace Protocol {

/// An object that asks a question of that kind, for its further keys.
json::Object question(char const* kind);
/// The kind that an object asks; empty when it says none.
std::string kindOf(json::Object const& question);

} // namespace Protocol
