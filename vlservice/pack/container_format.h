#pragma once
// The file that carries a mailing: where its parts lie, and the words of its index. Numbers are
// little-endian.
//
//   trailing offset   blobs, index, position of the index (8)                    (the one that is written)
//   leading offset    position of the index (8), blobs, index
//   wide header       WIDE_MAGIC with its zero, 8 bytes, n (4), n + 1 bytes of id, blobs, index,
//                     position of the index behind the start of the blobs (8), 20 bytes
//
// Offsets in the index count from the start of the file, under a wide header from the start of the blobs.

#include "vlservice/export.h"

#include <cstddef>
#include <cstdint>
#include <string_view>

namespace Container {

/// Opens a file with a wide header, in 16-bit units.
inline constexpr std::u16string_view WIDE_MAGIC = u"Corbulet";
/// The magic with its terminator, and what is read of any file to tell its layout.
inline constexpr std::size_t FIRST_BYTES_SIZE = (WIDE_MAGIC.size() + 1) * sizeof(char16_t);
/// Where the length of the id stands under a wide header; 8 bytes before it are not examined.
inline constexpr std::int64_t WIDE_ID_LENGTH_AT = FIRST_BYTES_SIZE + 8;
/// The length itself and one byte behind the id.
inline constexpr std::int64_t WIDE_ID_EXTRA = sizeof(std::uint32_t) + 1;
/// From the end of the file; only the first 8 bytes of it, the position of the index, are examined.
inline constexpr std::int64_t WIDE_TRAILER_SIZE = 28;

/// Begins the first blob of the other layouts; it is how blobs that were compressed for storage begin.
inline constexpr std::string_view BLOB_START = "TE";
inline constexpr std::size_t OFFSET_SIZE = sizeof(std::int64_t); ///< of a position
/// An index of this size or more is none.
inline constexpr std::int64_t INDEX_SIZE_LIMIT = std::int64_t{1} << 32;

/// The name of the metadata blob.
inline constexpr char JOB_METADATA[] = "DDT440001.TDD";

// Elements, each inside the one before: one item for each blob.
inline constexpr char TAG_ROOT[] = "vantelar";    ///< around all
inline constexpr char TAG_MAILING[] = "corbulet"; ///< the mailing
inline constexpr char TAG_ITEM[] = "mailitem";    ///< a blob

// Attributes of the mailing.
inline constexpr char MAILING_ID[] = "id";       ///< the pack id
inline constexpr char MAILING_ITEMS[] = "items"; ///< how many there are
/// Never written, and ignored where it stands.
inline constexpr char MAILING_TITLE[] = "subject";

// Attributes of an item.
inline constexpr char ITEM_NAME[] = "name";         ///< of the page
inline constexpr char ITEM_OFFSET[] = "offset";     ///< where the blob begins
inline constexpr char ITEM_LENGTH[] = "length";     ///< in bytes
inline constexpr char ITEM_ROLE[] = "role";         ///< one of those below
inline constexpr char ITEM_CRC[] = "crc";           ///< CRC-32 as stored
inline constexpr char ITEM_DOCUMENT[] = "document"; ///< that the page is of

inline constexpr char ROLE_PAGE[] = "page";           ///< a page
inline constexpr char ROLE_FRAMEWORK[] = "framework"; ///< the metadata

/// Whether the index can hold that id or name: UTF-8 of characters that XML 1.0 has.
VLSERVICE_EXPORT bool mayStandInIndex(std::string_view text);

} // namespace Container
