#pragma once
// Bytes and numbers as hexadecimal digits, in lower case.

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace Base {

constexpr std::string_view HEX_DIGITS = "0123456789abcdef";

/// So many digits as are asked for, with leading zeroes; what is higher is left out.
inline std::string hexNumber(std::uint64_t value, int digits) {
    std::string text;
    for (int shift = 4 * (digits - 1); shift >= 0; shift -= 4)
        text += HEX_DIGITS[value >> shift & 15];
    return text;
}

/// Two digits a byte.
inline std::string toHex(void const* bytes, std::size_t size) {
    auto const* const first = static_cast<unsigned char const*>(bytes);
    std::string text(2 * size, '\0');
    for (std::size_t i = 0; i < size; ++i) {
        text[2 * i] = HEX_DIGITS[first[i] >> 4];
        text[2 * i + 1] = HEX_DIGITS[first[i] & 15];
    }
    return text;
}

/// What a lower-case digit says; nothing of another character.
constexpr std::optional<unsigned> hexDigit(char c) {
    if (c >= '0' && c <= '9')
        return static_cast<unsigned>(c - '0');
    if (c >= 'a' && c <= 'f')
        return static_cast<unsigned>(c - 'a' + 10);
    return std::nullopt;
}

/// The bytes of lower-case digits, two a byte; nothing when the text is something else.
inline std::optional<std::string> fromHex(std::string_view text) {
    if (text.size() % 2 != 0)
        return std::nullopt;
    std::string bytes(text.size() / 2, '\0');
    for (std::size_t i = 0; i < bytes.size(); ++i) {
        auto const high = hexDigit(text[2 * i]);
        auto const low = hexDigit(text[2 * i + 1]);
        if (!high || !low)
            return std::nullopt;
        bytes[i] = static_cast<char>(*high << 4 | *low);
    }
    return bytes;
}

} // namespace Base
