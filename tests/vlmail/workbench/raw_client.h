#pragma once
// Connections to a workbench as a browser, or something worse, makes them.

#include <arpa/inet.h>
#include <cstdint>
#include <netinet/in.h>
#include <string>
#include <sys/socket.h>
#include <unistd.h>

/// A connection to a port of this machine. Calls wait; a failure is the empty text.
class RawClient {
public:
    explicit RawClient(std::uint16_t port) : socket_(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_port = htons(port);
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        ::connect(socket_, reinterpret_cast<sockaddr const*>(&address), sizeof address);
    }
    ~RawClient() { ::close(socket_); }
    RawClient(RawClient const&) = delete;
    RawClient& operator=(RawClient const&) = delete;

    void send(std::string const& text) { ::send(socket_, text.data(), text.size(), MSG_NOSIGNAL); }

    /// Header and body of one answer, as far as it comes before the connection ends.
    std::string answer() {
        std::string text;
        while (!isWhole(text) && more(text)) {
        }
        return text;
    }
    std::string ask(std::string const& request) {
        send(request);
        return answer();
    }
    /// All that comes until the other side closes.
    std::string rest() {
        std::string text;
        while (more(text)) {
        }
        return text;
    }

private:
    static bool isWhole(std::string const& text) {
        std::size_t const end = text.find("\r\n\r\n");
        std::size_t const length = text.find("Content-Length: ");
        if (end == std::string::npos || length == std::string::npos)
            return false;
        return text.size() >= end + 4 + std::stoul(text.substr(length + 16));
    }

    bool more(std::string& text) {
        char room[4096];
        ssize_t const size = ::recv(socket_, room, sizeof room, 0);
        if (size > 0)
            text.append(room, static_cast<std::size_t>(size));
        return size > 0;
    }

    int socket_;
};
