#pragma once
// What both sides of a connection say and know in many tests.

#include "programs/channel/frame.h"
#include "programs/channel/proof.h"

#include <cstdint>
#include <string>

namespace ChannelTest {

inline std::string const TOKEN = "0123456789abcdef0123456789abcdef";
inline constexpr auto NO_KNOWLEDGE = "Whoever answers there does not know our access token, or passes us on.";
inline constexpr auto NO_GREETING = "The greeting is missing.";
inline constexpr auto NOT_SEALED = "A message is not sealed by the other side of this connection.";

/// As both sides of a connection without TLS see it.
inline Channel::Terms plainTerms(std::uint16_t version = Channel::VERSION) {
    return {version, TOKEN, "", "127.0.0.1:40000", "127.0.0.1:4711"};
}

} // namespace ChannelTest
