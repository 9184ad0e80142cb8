#pragma once
// Names and messages from the operating system as valid text.

#include <string>

namespace Base {

/// The text with U+FFFD for each stretch that is not UTF-8: JSON and terminals take nothing else.
std::string validUtf8(std::string const& text);

/// The text with a blank for each line break and each other control character of ASCII.
std::string onOneLine(std::string text);

} // namespace Base
