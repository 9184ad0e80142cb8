#pragma once
// UTF-8 by its characters.

#include <algorithm>
#include <cstddef>
#include <string_view>

namespace Reader {

inline bool beginsLetter(char byte) { return (static_cast<unsigned char>(byte) & 0xC0) != 0x80; }

inline std::size_t countLetters(std::string_view text) {
    return static_cast<std::size_t>(std::count_if(text.begin(), text.end(), beginsLetter));
}

} // namespace Reader
