#pragma once
// How messages lie on the connection. Each side begins with a preface, the magic and the version; then
// messages follow, each a header and the text of a JSON object:
//
//     preface = "VLCH" version:u16
//     header  = command:u8 kind:u8 sequence:u32 length:u32
//     message = header text seal, with `length` bytes of text
//
// A seal of 32 bytes stands behind each message of version 2 on a connection without TLS, once the greeting
// is over; else there is none. Numbers are in network order. Command 0 is the greeting. A response or an
// error has its request's command and sequence number; an error's text is an object with the key "err". Data
// and what says that it is stored are of version 2 alone, and their texts are no JSON.

#include "programs/channel/seal.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>

namespace Channel {

constexpr std::string_view MAGIC = "VLCH";
constexpr std::uint16_t VERSION_1 = 1;
constexpr std::uint16_t VERSION = 2;
constexpr std::size_t PREFACE_SIZE = 6;
constexpr std::size_t HEADER_SIZE = 10;
constexpr std::uint32_t MAX_TEXT = 16 * 1024 * 1024;
constexpr std::uint8_t GREETING = 0;

enum class Kind : std::uint8_t {
    Request = 1,
    Response = 2,
    Error = 3,
    /// A piece of a page, as data_message.h tells.
    Data = 4,
    /// The data up to that sequence number is stored; without a text.
    Stored = 5,
};

struct Frame {
    std::uint8_t command = 0;
    Kind kind = Kind::Request;
    std::uint32_t sequence = 0;
    /// In the decoder's memory, until its next call.
    std::string_view text;
};

/// The six bytes that each side begins with.
std::string preface(std::uint16_t version = VERSION);
/// The version in the first bytes of a connection, if they are a preface.
std::optional<std::uint16_t> versionIn(std::string_view bytes);
/// Appends a message. Throws Error when the text is too long.
void appendFrame(std::string& bytes, Frame const& frame);

/// Cuts received bytes into messages. What is not of this protocol throws Error, as soon as it can be seen;
/// the decoder is of no use afterwards.
class FrameDecoder {
public:
    /// Longer texts than this are refused; at most MAX_TEXT.
    void limitText(std::uint32_t limit) { limit_ = limit; }
    /// From now on each message carries a seal, under this key.
    void expectSeals(std::string key) { seal_.emplace(std::move(key)); }
    /// In the preface; 0 before it is there.
    std::uint16_t version() const { return version_; }

    /// Room for bytes to come: a small piece, or as much again as has come of a long text.
    std::span<char> room();
    /// So many bytes have been put into the room.
    void commit(std::size_t size) { filled_ += size; }

    /// The next message, if all of it is there.
    std::optional<Frame> next();

    /// Whether a message has begun and is not complete.
    bool isInside() const { return filled_ > begin_; }
    /// The size of the message that has begun, with header and seal, when the header is there; else 0.
    std::size_t announced() const;

private:
    std::string_view unread() const { return {bytes_.data() + begin_, filled_ - begin_}; }
    bool readPreface();
    void requireSeal(std::string_view message, std::string_view seal);

    std::string bytes_;
    std::size_t begin_ = 0;
    std::size_t filled_ = 0;
    std::uint32_t limit_ = MAX_TEXT;
    std::uint16_t version_ = 0;
    std::optional<Seal> seal_;
};

} // namespace Channel
