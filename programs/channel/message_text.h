#pragma once
// The texts of messages.

#include "vlservice/json/json.h"

#include <string>
#include <string_view>

namespace Channel {

/// How much memory the values of a message may take at the most, by an estimate.
constexpr std::size_t MAX_REQUEST_VALUES = 128 * 1024 * 1024;
constexpr std::size_t MAX_ANSWER_VALUES = 256 * 1024 * 1024;

std::string print(json::Object const& object);
/// Throws json::Exc, and Error when its values would take more memory than the limit.
json::Object parse(std::string_view text, std::size_t limit = MAX_REQUEST_VALUES);

/// An error's text: one line, cut to a length that a message can have.
std::string printError(std::string const& reason);
/// The reason in an error's text; a text of its own when there is none.
std::string reasonOf(std::string_view errorText);

} // namespace Channel
