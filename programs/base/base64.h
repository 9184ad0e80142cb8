#pragma once
// Bytes in texts.

#include <optional>
#include <string>
#include <string_view>

namespace Base {

/// Four characters for three bytes, padded with "=", in one line.
std::string toBase64(std::string_view bytes);
/// The bytes of what toBase64() gives; none for any other text.
std::optional<std::string> fromBase64(std::string_view text);

} // namespace Base
