#pragma once
// How a service tells within an answer that it could not do what it was asked.

#include "vlservice/json/json.h"

#include <string>

namespace Protocol {

/// An answer that is a failure is an object with this one key; the library's own answers use it too.
inline constexpr char const* ERROR_KEY = "err";

inline json::Object failureAnswer(std::string const& line) { return {{ERROR_KEY, line}}; }

/// The line of a failure; empty when the answer is none.
inline std::string failureIn(json::Object const& answer) { return answer.get(ERROR_KEY).textOrEmpty(); }

} // namespace Protocol
