#pragma once
// Names and values as a sentence quotes them.

#include <string>
#include <string_view>

namespace Base {

inline std::string inQuotes(std::string_view text) { return '"' + std::string(text) + '"'; }

} // namespace Base
