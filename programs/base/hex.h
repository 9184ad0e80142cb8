#pragma once
// Bytes and numbers as hexadecimal digits, in lower case.

#include <cstddef>
#include <cstdint>
#include <string>

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

} // namespace Base
