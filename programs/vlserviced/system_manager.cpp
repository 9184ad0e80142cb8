#include "programs/vlserviced/system_manager.h"

#include "programs/base/error.h"

#include <boost/asio/ip/tcp.hpp>
#include <systemd/sd-daemon.h>

#include <cstdint>
#include <cstdlib>
#include <filesystem>

namespace VlServiced {
namespace {

namespace fs = std::filesystem;
using boost::asio::ip::tcp;

constexpr char const* CREDENTIALS = "CREDENTIALS_DIRECTORY";

/// The file of a credential; empty when there is none.
std::string credential(char const* name) {
    char const* const folder = std::getenv(CREDENTIALS);
    if (!folder)
        return {};
    fs::path const file = fs::path(folder) / name;
    std::error_code unknown;
    return fs::exists(file, unknown) ? file.string() : std::string();
}

void takeCredential(std::string& file, char const* name) {
    if (file.empty())
        file = credential(name);
}

tcp::endpoint endpointOf(int socket) {
    tcp::endpoint endpoint;
    auto size = static_cast<socklen_t>(endpoint.capacity());
    if (::getsockname(socket, endpoint.data(), &size) != 0)
        throw Base::Error(Base::Code::AddressUnusable,
                          "The socket that the system's manager hands over has no address.");
    endpoint.resize(size);
    return endpoint;
}

void takeSocket(Options& options) {
    int const count = ::sd_listen_fds(0);
    if (count <= 0)
        return;
    int const socket = SD_LISTEN_FDS_START;
    if (count > 1)
        throw Base::Error(Base::Code::AddressUnusable,
                          "The system's manager hands over " + std::to_string(count) +
                              " sockets; the service takes one: leave one ListenStream= in its unit.");
    if (::sd_is_socket_inet(socket, AF_UNSPEC, SOCK_STREAM, 1, 0) <= 0)
        throw Base::Error(Base::Code::AddressUnusable,
                          "The socket that the system's manager hands over does not listen for TCP.");
    tcp::endpoint const endpoint = endpointOf(socket);
    options.socket = socket;
    options.listen = endpoint.address().to_string();
    options.port = endpoint.port();
}

/// A third of the time after which the manager takes the service for dead.
std::chrono::microseconds aliveInterval() {
    std::uint64_t limit = 0;
    return ::sd_watchdog_enabled(0, &limit) > 0 ? std::chrono::microseconds(limit / 3)
                                                : std::chrono::microseconds(0);
}

} // namespace

void takeHandedOver(Options& options) {
    takeSocket(options);
    takeCredential(options.token, "token");
    takeCredential(options.certificate, "certificate");
    takeCredential(options.key, "key");
}

SystemManager::SystemManager(boost::asio::io_context& io) : timer_(io), interval_(aliveInterval()) {}

void SystemManager::onReady(std::string const& status) {
    ::sd_notify(0, ("READY=1\nSTATUS=" + status).c_str());
    if (interval_.count() > 0)
        tellAlive();
}

void SystemManager::onStopping() {
    timer_.cancel();
    ::sd_notify(0, "STOPPING=1");
}

void SystemManager::tellAlive() {
    ::sd_notify(0, "WATCHDOG=1");
    timer_.expires_after(interval_);
    timer_.async_wait([this](boost::system::error_code const& ec) {
        if (!ec)
            tellAlive();
    });
}

} // namespace VlServiced
