#include "programs/base/host_port.h"

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <charconv>
#include <system_error>

namespace Base {
namespace {

constexpr std::size_t MAX_HOST_BYTES = 255;

bool isIp6(std::string_view host) { return host.find(':') != std::string_view::npos; }

std::optional<std::uint16_t> portIn(std::string_view text) {
    std::uint16_t port = 0;
    auto const [end, failure] = std::from_chars(text.data(), text.data() + text.size(), port);
    if (failure != std::errc() || end != text.data() + text.size() || port == 0)
        return std::nullopt;
    return port;
}

} // namespace

std::string hostPortText(std::string_view host, std::uint16_t port) {
    std::string const text(host);
    return (isIp6(host) ? '[' + text + ']' : text) + ':' + std::to_string(port);
}

std::optional<HostPort> hostPortIn(std::string_view text) {
    std::size_t const colon = text.rfind(':');
    if (colon == std::string_view::npos)
        return std::nullopt;
    std::string_view host = text.substr(0, colon);
    bool const inBrackets = host.size() > 2 && host.front() == '[' && host.back() == ']';
    if (inBrackets)
        host = host.substr(1, host.size() - 2);
    auto const port = portIn(text.substr(colon + 1));
    if (!port || !isHost(host) || (!inBrackets && isIp6(host)))
        return std::nullopt;
    return HostPort{std::string(host), *port};
}

bool isHost(std::string_view host) {
    return !host.empty() && host.size() <= MAX_HOST_BYTES &&
           std::all_of(host.begin(), host.end(), [](unsigned char c) {
               return std::isalnum(c) || std::string_view(".-_:%").find(static_cast<char>(c)) < 5;
           });
}

std::string whyNotListening(int error) {
    auto const remedy = [error] {
        switch (error) {
        case EADDRINUSE:
            return "end what listens there, or listen elsewhere";
        case EADDRNOTAVAIL:
            return "name an address of this machine";
        case EACCES:
            return "get the right to, which ports below 1024 want, or listen elsewhere";
        default:
            return "listen elsewhere";
        }
    };
    return std::generic_category().message(error) + "; " + remedy();
}

} // namespace Base
