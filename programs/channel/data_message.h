#pragma once
// Pieces of pages on their way to the service: the texts of data messages, which are no JSON.
//
//     text = idLength:u8 id position:u32 documentLength:u16 document pageLength:u16 page size:u64 offset:u64
//     bytes
//
// Numbers are in network order. A page goes out as one piece or as several in order, each up to a MiB.

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace Channel {

/// The command that data is for: Process Pack.
constexpr std::uint8_t PACK_DATA = 25;
/// The bytes of a page in one piece at the most.
constexpr std::size_t MAX_PIECE = 1024 * 1024;
/// A text with the longest names.
constexpr std::size_t MAX_DATA_TEXT = MAX_PIECE + 1 + 255 + 4 + 2 * (2 + 65535) + 2 * 8;
/// How many bytes of texts a client may have sent that it was not told of as stored.
constexpr std::size_t DATA_WINDOW = 16 * MAX_PIECE;

struct DataPiece {
    std::string_view packId;
    /// Of the page among those of its pack, from 0.
    std::uint32_t position = 0;
    std::string_view document;
    std::string_view page;
    /// Of the whole page.
    std::uint64_t size = 0;
    /// Where in the page the bytes lie.
    std::uint64_t offset = 0;
    std::string_view bytes;

    bool isLast() const { return offset + bytes.size() == size; }
};

/// The text of a data message. Throws Error when a name, an id or the bytes are too long for one.
std::string printData(DataPiece const& piece);
/// What a text says, in its memory. Throws Error when it is none, also when its bytes lie outside its page.
DataPiece parseData(std::string_view text);

} // namespace Channel
