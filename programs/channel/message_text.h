#pragma once
// The texts of messages.

#include "vlservice/json/json.h"

#include <string>
#include <string_view>

namespace Channel {

std::string print(json::Object const& object);
/// Throws json::Exc.
json::Object parse(std::string_view text);

/// An error's text. Bytes that are no UTF-8 are replaced.
std::string printError(std::string const& reason);
/// The reason in an error's text; a text of its own when there is none.
std::string reasonOf(std::string_view errorText);

} // namespace Channel
