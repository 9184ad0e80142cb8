#pragma once
// Bytes and numbers as hexadecimal digits, in lower case.

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace Base {

/// So many digits as are asked for, with leading zeroes; what is higher is left out.
inline std::string hexNumber(std::uint64_t value, int digits) {
    std::string text;
    for (int shift = 4 * (digits - 1); shift >= 0; shift -= 4)
        text += "0123456789abcdef"[value >> shift & 15];
    return text;
}

/// Two digits a byte.
inline std::string toHex(void const* bytes, std::size_t size) {
    auto const* const first = static_cast<unsigned char const*>(bytes);
    std::string text;
    for (std::size_t i = 0; i < size; ++i)
        text += hexNumber(first[i], 2);
    return text;
}

/// The bytes of lower-case digits, two a byte; nothing when the text is something else.
inline std::optional<std::string> fromHex(std::string_view text) {
    constexpr std::string_view DIGITS = "0123456789abcdef";
    if (text.size() % 2 != 0 || text.find_first_not_of(DIGITS) != std::string_view::npos)
        return std::nullopt;
    std::string bytes;
    for (std::size_t i = 0; i < text.size(); i += 2)
        bytes += static_cast<char>(DIGITS.find(text[i]) << 4 | DIGITS.find(text[i + 1]));
    return bytes;
}

} // namespace Base
