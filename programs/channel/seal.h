#pragma once
// Codes that hold the messages of a connection without TLS, so that nobody on its way adds, drops, changes or
// reorders one unseen.

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <utility>

namespace Channel {

/// The codes of one direction: each message has a key of its own, made from the direction's key and the
/// message's number.
class Seal {
public:
    /// Bytes behind each message.
    static constexpr std::size_t SIZE = 32;

    explicit Seal(std::string key) : key_(std::move(key)) {}

    /// The code of the next message. Throws Error when the crypto library fails.
    std::string next(std::string_view message);

private:
    std::string key_;
    std::uint64_t number_ = 0;
};

/// The keys of both directions, 32 bytes each.
struct SealKeys {
    std::string client;
    std::string service;
};

} // namespace Channel
