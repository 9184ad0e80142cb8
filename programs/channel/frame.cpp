#include "programs/channel/frame.h"

#include "programs/base/error.h"
#include "programs/channel/data_message.h"
#include "programs/channel/network_order.h"
#include "programs/channel/proof.h"

#include <algorithm>

namespace Channel {
namespace {

/// What is read at once while nothing long is on its way.
constexpr std::size_t PIECE = 8 * 1024;
/// An idle connection keeps no more memory than this.
constexpr std::size_t KEPT = 64 * 1024;

// Offsets in the header.
constexpr std::size_t COMMAND_AT = 0;
constexpr std::size_t KIND_AT = 1;
constexpr std::size_t SEQUENCE_AT = 2;
constexpr std::size_t LENGTH_AT = 6;

[[noreturn]] void refuseLength(std::size_t length, std::size_t limit) {
    throw Base::Error(Base::Code::TooLarge, "A message of " + std::to_string(length) +
                                                " bytes is over the limit of " + std::to_string(limit) + ".");
}

bool isKind(std::uint8_t kind, std::uint16_t version) {
    Kind const last = version == VERSION_1 ? Kind::Error : Kind::Stored;
    return kind >= static_cast<std::uint8_t>(Kind::Request) && kind <= static_cast<std::uint8_t>(last);
}

std::uint32_t limitOf(Kind kind, std::uint32_t limit) {
    switch (kind) {
    case Kind::Data:
        return std::min<std::uint32_t>(limit, MAX_DATA_TEXT);
    case Kind::Stored:
        return 0;
    default:
        return limit;
    }
}

} // namespace

std::string preface(std::uint16_t version) {
    std::string bytes(MAGIC);
    appendNumber(bytes, version);
    return bytes;
}

std::optional<std::uint16_t> versionIn(std::string_view bytes) {
    if (bytes.size() < PREFACE_SIZE || !bytes.starts_with(MAGIC))
        return std::nullopt;
    return numberAt<std::uint16_t>(bytes, MAGIC.size());
}

void appendFrame(std::string& bytes, Frame const& frame) {
    if (frame.text.size() > MAX_TEXT)
        refuseLength(frame.text.size(), MAX_TEXT);
    bytes.reserve(bytes.size() + HEADER_SIZE + frame.text.size() + Seal::SIZE);
    appendNumber(bytes, frame.command);
    appendNumber(bytes, static_cast<std::uint8_t>(frame.kind));
    appendNumber(bytes, frame.sequence);
    appendNumber(bytes, static_cast<std::uint32_t>(frame.text.size()));
    bytes += frame.text;
}

std::span<char> FrameDecoder::room() {
    std::size_t const held = filled_ - begin_;
    std::copy_n(bytes_.begin() + static_cast<std::ptrdiff_t>(begin_), held, bytes_.begin());
    begin_ = 0;
    filled_ = held;
    if (held == 0 && bytes_.size() > KEPT)
        bytes_ = std::string();
    // Twice what is held at the most: a length that only was announced allocates nothing.
    std::size_t const missing = announced() > held ? announced() - held : 0;
    std::size_t const wanted = std::clamp(missing, PIECE, std::max(PIECE, held));
    if (bytes_.size() < held + wanted)
        bytes_.resize(held + wanted);
    return {bytes_.data() + held, wanted};
}

std::optional<Frame> FrameDecoder::next() {
    if (version_ == 0 && !readPreface())
        return std::nullopt;
    std::size_t const size = announced();
    if (size == 0 || unread().size() < size)
        return std::nullopt;
    std::size_t const sealSize = seal_ ? Seal::SIZE : 0;
    std::string_view const message = unread().substr(0, size - sealSize);
    requireSeal(message, unread().substr(message.size(), sealSize));
    begin_ += size;
    return Frame{numberAt<std::uint8_t>(message, COMMAND_AT),
                 static_cast<Kind>(numberAt<std::uint8_t>(message, KIND_AT)),
                 numberAt<std::uint32_t>(message, SEQUENCE_AT), message.substr(HEADER_SIZE)};
}

std::size_t FrameDecoder::announced() const {
    if (version_ == 0 || unread().size() < HEADER_SIZE)
        return 0;
    auto const kind = numberAt<std::uint8_t>(unread(), KIND_AT);
    if (!isKind(kind, version_))
        throw Base::Error(Base::Code::ConnectionBroken,
                          "There is no message of kind " + std::to_string(kind) + ".");
    auto const length = numberAt<std::uint32_t>(unread(), LENGTH_AT);
    std::uint32_t const limit = limitOf(static_cast<Kind>(kind), limit_);
    if (length > limit)
        refuseLength(length, limit);
    return HEADER_SIZE + length + (seal_ ? Seal::SIZE : 0);
}

void FrameDecoder::requireSeal(std::string_view message, std::string_view seal) {
    if (seal_ && !isSameProof(seal, seal_->next(message)))
        throw Base::Error(Base::Code::ConnectionBroken,
                          "A message is not sealed by the other side of this connection.");
}

bool FrameDecoder::readPreface() {
    std::string_view const magic = unread().substr(0, MAGIC.size());
    if (magic != MAGIC.substr(0, magic.size()))
        throw Base::Error(Base::Code::ConnectionBroken, "The first bytes are not those of this protocol.");
    if (unread().size() < PREFACE_SIZE)
        return false;
    std::uint16_t const version = *versionIn(unread());
    if (version < VERSION_1 || version > VERSION)
        throw Base::Error(Base::Code::VersionMismatch,
                          "Version " + std::to_string(version) +
                              " of the protocol is not spoken here, only the versions " +
                              std::to_string(VERSION_1) + " and " + std::to_string(VERSION) + '.');
    begin_ += PREFACE_SIZE;
    version_ = version;
    return true;
}

} // namespace Channel
