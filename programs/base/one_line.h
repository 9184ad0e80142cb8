#pragma once
// Texts from anywhere as one line that can be logged, stored and sent.

#include <string>

namespace Base {

/// The text without line breaks and control characters, at most 500 bytes, valid UTF-8: bytes beyond ASCII
/// become "?" when the text is none.
std::string oneLine(std::string const& text);

/// Whether the text is valid UTF-8 without control characters, and no longer than that many bytes.
bool isPlainText(std::string const& text, std::size_t maxBytes);

} // namespace Base
