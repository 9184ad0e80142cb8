#pragma once
// A port for a server that cannot choose one itself.

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cstdint>

namespace VLServiceTest {

/// One of 127.0.0.1 that nobody had a moment ago. Who starts a server on it tries another when it is taken.
inline std::uint16_t freePort() {
    int const socket = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t size = sizeof address;
    auto* const plain = reinterpret_cast<sockaddr*>(&address);
    bool const isBound = ::bind(socket, plain, size) == 0 && ::getsockname(socket, plain, &size) == 0;
    ::close(socket);
    return isBound ? ntohs(address.sin_port) : 0;
}

} // namespace VLServiceTest
