#include "tests/support/cutting_relay.h"

#include <arpa/inet.h>
#include <fcntl.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <system_error>
#include <utility>
#include <vector>

namespace VLServiceTest {
namespace {

[[noreturn]] void fail(char const* what) { throw std::system_error(errno, std::generic_category(), what); }

sockaddr_in endpointAt(char const* host, std::uint16_t port) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(port);
    ::inet_pton(AF_INET, host, &address.sin_addr);
    return address;
}

bool sendAll(int to, char const* bytes, ssize_t size) {
    while (size > 0) {
        ssize_t const sent = ::send(to, bytes, static_cast<std::size_t>(size), MSG_NOSIGNAL);
        if (sent <= 0)
            return false;
        bytes += sent;
        size -= sent;
    }
    return true;
}

void withoutDelay(int socket) {
    int const on = 1;
    ::setsockopt(socket, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
}

} // namespace

int connectedTo(std::uint16_t port, char const* host) {
    int const socket = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in const address = endpointAt(host, port);
    if (::connect(socket, reinterpret_cast<sockaddr const*>(&address), sizeof address) != 0) {
        ::close(socket);
        return -1;
    }
    withoutDelay(socket);
    return socket;
}

CuttingRelay::CuttingRelay(Connect connect, char const* host)
    : connect_(std::move(connect)), listener_(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    sockaddr_in address = endpointAt(host, 0);
    socklen_t size = sizeof address;
    auto* const plain = reinterpret_cast<sockaddr*>(&address);
    if (::bind(listener_, plain, size) != 0 || ::listen(listener_, 16) != 0 ||
        ::getsockname(listener_, plain, &size) != 0 || ::pipe2(wake_, O_CLOEXEC) != 0)
        fail("no relay");
    port_ = ntohs(address.sin_port);
    thread_ = std::thread([this] { run(); });
}

CuttingRelay::~CuttingRelay() {
    ::close(wake_[1]);
    thread_.join();
    for (Connection const& connection : connections_) {
        ::close(connection.client);
        ::close(connection.server);
    }
    ::close(wake_[0]);
    ::close(listener_);
}

void CuttingRelay::onPiece(OnPiece onPiece) {
    std::lock_guard<std::mutex> const lock(mutex_);
    onPiece_ = std::move(onPiece);
    pieces_ = 0;
}

int CuttingRelay::pieces() const {
    std::lock_guard<std::mutex> const lock(mutex_);
    return pieces_;
}

bool CuttingRelay::isAllowed() {
    std::lock_guard<std::mutex> const lock(mutex_);
    ++pieces_;
    return !onPiece_ || onPiece_(pieces_);
}

void CuttingRelay::accept() {
    int const client = ::accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
    if (client < 0)
        return;
    withoutDelay(client);
    int const server = connect_();
    if (server < 0)
        ::close(client);
    else
        connections_.push_back({client, server});
}

bool CuttingRelay::pass(int from, int to) {
    std::array<char, 65536> bytes;
    ssize_t const size = ::recv(from, bytes.data(), bytes.size(), 0);
    return size > 0 && isAllowed() && sendAll(to, bytes.data(), size);
}

void CuttingRelay::run() {
    for (;;) {
        std::vector<pollfd> sockets{{wake_[0], POLLIN, 0}, {listener_, POLLIN, 0}};
        for (Connection const& connection : connections_) {
            sockets.push_back({connection.client, POLLIN, 0});
            sockets.push_back({connection.server, POLLIN, 0});
        }
        if (::poll(sockets.data(), sockets.size(), -1) < 0 || sockets[0].revents != 0)
            return;
        std::size_t at = 2;
        for (auto one = connections_.begin(); one != connections_.end(); at += 2) {
            bool const isOpen = (sockets[at].revents == 0 || pass(one->client, one->server)) &&
                                (sockets[at + 1].revents == 0 || pass(one->server, one->client));
            auto const here = one++;
            if (isOpen)
                continue;
            ::close(here->client);
            ::close(here->server);
            connections_.erase(here);
        }
        if (sockets[1].revents != 0)
            accept();
    }
}

} // namespace VLServiceTest
