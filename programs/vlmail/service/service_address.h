#pragma once
// Where a service is.

#include "vlservice/json/json.h"

#include <cstdint>
#include <optional>
#include <string>

namespace VlMail {

struct ServiceAddress {
    std::string host;
    std::uint16_t port = 0;

    /// HOST:PORT, with brackets around an IPv6 address.
    std::string text() const;
};

/// Reads HOST:PORT; an IPv6 address stands in brackets. Throws Error.
ServiceAddress parseServiceAddress(std::string const& text);
/// The address in an answer on the network; none when there is none in it that could be one.
std::optional<ServiceAddress> addressInAnswer(json::Object const& answer);

} // namespace VlMail
