#pragma once
// What both sides of a connection say and know in many tests.

#include <string>

namespace ChannelTest {

inline std::string const TOKEN = "0123456789abcdef0123456789abcdef";
inline constexpr auto NO_KNOWLEDGE = "Whoever answers there does not know our access token, or passes us on.";
inline constexpr auto NOT_SEALED = "A message is not sealed by the other side of this connection.";

} // namespace ChannelTest
