#pragma once
// Bytes as hexadecimal digits.

#include <span>
#include <string>

namespace Base {

inline std::string toHex(std::span<unsigned char const> bytes) {
    constexpr char const* DIGITS = "0123456789abcdef";
    std::string text;
    for (unsigned char const byte : bytes) {
        text += DIGITS[byte >> 4];
        text += DIGITS[byte & 15];
    }
    return text;
}

} // namespace Base
