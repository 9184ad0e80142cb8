#pragma once
// An address as people write it: HOST:PORT, an IPv6 host in brackets.

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace Base {

struct HostPort {
    /// A name, or an address without brackets.
    std::string host;
    /// Never 0.
    std::uint16_t port = 0;
};

/// "192.0.2.1:5000", "[2001:db8::1]:5000", "mail.example:25".
std::string hostPortText(std::string_view host, std::uint16_t port);

/// The other way; nothing when there is no port, an IPv6 address stands without brackets, or the host is
/// none.
std::optional<HostPort> hostPortIn(std::string_view text);

/// Whether it can be the host of an address: 1 to 255 letters, digits and ".-_:%" of ASCII.
bool isHost(std::string_view host);

/// Why nobody can listen at an address or a path, by `errno`, and what to do about it.
std::string whyNotListening(int error);

} // namespace Base
