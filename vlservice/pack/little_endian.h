#pragma once
// Numbers as bytes, lowest first, at any address.

#include <cstddef>

namespace LittleEndian {

template<typename Unsigned>
Unsigned load(void const* from) {
    auto const* const bytes = static_cast<unsigned char const*>(from);
    Unsigned number = 0;
    for (std::size_t i = 0; i < sizeof(Unsigned); ++i)
        number |= static_cast<Unsigned>(static_cast<Unsigned>(bytes[i]) << (8 * i));
    return number;
}

template<typename Unsigned>
void store(Unsigned number, void* to) {
    auto* const bytes = static_cast<unsigned char*>(to);
    for (std::size_t i = 0; i < sizeof(Unsigned); ++i)
        bytes[i] = static_cast<unsigned char>(number >> (8 * i));
}

} // namespace LittleEndian
