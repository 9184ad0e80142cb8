#pragma once
// The compressed form of a blob, as containers and databases keep it:
//
//   blob = DB_ZIP_MAGIC, size of the data (unsigned, 64 bits, little-endian), zlib stream of the data

#include <cstddef>
#include <string_view>

inline constexpr std::string_view DB_ZIP_MAGIC = "TEZ";                    ///< begins a blob
inline constexpr std::size_t DB_ZIP_HEADER_SIZE = DB_ZIP_MAGIC.size() + 8; ///< magic and size
/// zlib's fastest: pages are compressed on their way through, not for the last byte.
inline constexpr int DB_ZIP_LEVEL = 1;
