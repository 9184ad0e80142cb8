#pragma once
// The questions that one command carries: each is an object, and its key "query" says which it is.

#include "vlservice/json/json.h"

#include <string>

namespace Protocol {

/// An object that asks a question of that kind, for its further keys.
json::Object question(char const* kind);
/// The kind that an object asks; empty when it says none.
std::string kindOf(json::Object const& question);

/// The key under which a question names a node.
inline constexpr char const* NODE_ID = "id";
/// The id of the node that a question names; `owner` says in messages what question that is. Throws Error
/// when there is none: a node is never taken for the root because its id is missing.
std::string nodeIn(json::Object const& question, std::string const& owner);

} // namespace Protocol
