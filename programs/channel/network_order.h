#pragma once
// Numbers as they lie on the connection: the highest byte first.

#include <cstddef>
#include <string>
#include <string_view>

namespace Channel {

template<typename Number>
void appendNumber(std::string& bytes, Number number) {
    for (int shift = 8 * (static_cast<int>(sizeof number) - 1); shift >= 0; shift -= 8)
        bytes += static_cast<char>(number >> shift & 0xff);
}

/// The bytes have to be there.
template<typename Number>
Number numberAt(std::string_view bytes, std::size_t offset) {
    Number number = 0;
    for (char const byte : bytes.substr(offset, sizeof number))
        number = static_cast<Number>(number << 8 | static_cast<unsigned char>(byte));
    return number;
}

} // namespace Channel
