#include "tests/support/hostile_peers.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <stdexcept>

namespace VLServiceTest {
namespace {

using namespace std::string_literals;

const std::string PREFACE = "VLCH\0\2"s;

std::string frame(int command, int kind, std::uint32_t claim, std::string const& text) {
    std::string bytes{static_cast<char>(command), static_cast<char>(kind), 0, 0, 0, 0};
    for (int shift = 24; shift >= 0; shift -= 8)
        bytes += static_cast<char>(claim >> shift & 0xFF);
    return bytes + text;
}

std::string frame(int command, int kind, std::string const& text) {
    return frame(command, kind, static_cast<std::uint32_t>(text.size()), text);
}

std::string times(int count, std::string const& text) {
    std::string all;
    for (int i = 0; i < count; ++i)
        all += text;
    return all;
}

sockaddr_in loopback(std::uint16_t port) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(port);
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    return address;
}

int openSocket() {
    int const opened = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (opened < 0)
        throw std::runtime_error("no socket");
    return opened;
}

bool say(int peer, std::string const& bytes) {
    std::size_t said = 0;
    while (said < bytes.size()) {
        ssize_t const step = ::send(peer, bytes.data() + said, bytes.size() - said, MSG_NOSIGNAL);
        if (step <= 0)
            return false;
        said += static_cast<std::size_t>(step);
    }
    return true;
}

/// Returns when the other side has closed, or was closed to.
void doIt(int peer, Hostility const& hostility) {
    while (say(peer, hostility.bytes) && hostility.isRepeated) {
    }
    if (!hostility.stays)
        ::shutdown(peer, SHUT_RDWR);
    char ignored[4096];
    while (::recv(peer, ignored, sizeof ignored, 0) > 0) {
    }
}

} // namespace

std::vector<Hostility> const& hostilities() {
    constexpr int REQUEST = 1, RESPONSE = 2, ERROR = 3, JOBS = 18;
    static std::vector<Hostility> const all{
        {"Silence", ""},
        {"HalfAPreface", "VL"},
        {"HalfAHeader", PREFACE + "\0\1"s},
        {"HalfAFrame", PREFACE + frame(0, REQUEST, 100, "{\"non")},
        {"AnEndInAFrame", PREFACE + frame(0, RESPONSE, 100, "{\"non"), false, false},
        {"AnEndAtOnce", "", false, false},
        {"AFloodOfGarbage", times(4096, "\xFF\0garbage"s), true},
        {"AFloodOfGreetings", PREFACE + times(1000, frame(0, REQUEST, R"({"nonce":"n"})")), true},
        {"AFloodOfRefusals", PREFACE + times(1000, frame(0, ERROR, R"({"err":"no"})")), true},
        {"AGreatLength", PREFACE + frame(0, RESPONSE, 0xFFFFFFFF, "")},
        {"AForgedProof",
         PREFACE + frame(0, RESPONSE, R"({"nonce":"n","proof":")" + std::string(64, '0') + "\"}")},
        {"AForgedAnswer", PREFACE + frame(JOBS, RESPONSE, R"({"jobs":[{"id":"p1","state":"delivered"}]})")},
        {"DeepNesting", PREFACE + frame(0, RESPONSE, std::string(900, '['))},
        {"ControlsOfATerminal", PREFACE + frame(0, ERROR, "{\"err\":\"\\u001b[2J\\u009b\\u202e\"}")},
    };
    return all;
}

HostileClients::HostileClients(std::uint16_t port, Hostility const& hostility, int count) {
    sockaddr_in const address = loopback(port);
    for (int i = 0; i < count; ++i) {
        int const peer = openSocket();
        sockets_.push_back(peer);
        if (::connect(peer, reinterpret_cast<sockaddr const*>(&address), sizeof address) == 0)
            threads_.emplace_back([peer, hostility] { doIt(peer, hostility); });
    }
}

HostileClients::~HostileClients() {
    for (int const peer : sockets_)
        ::shutdown(peer, SHUT_RDWR);
    for (std::thread& thread : threads_)
        thread.join();
    for (int const peer : sockets_)
        ::close(peer);
}

HostileService::HostileService(Hostility const& hostility) : listener_(openSocket()) {
    sockaddr_in address = loopback(0);
    socklen_t size = sizeof address;
    auto* const any = reinterpret_cast<sockaddr*>(&address);
    if (::bind(listener_, any, size) != 0 || ::listen(listener_, 1) != 0 ||
        ::getsockname(listener_, any, &size) != 0)
        throw std::runtime_error("no port");
    port_ = ntohs(address.sin_port);
    thread_ = std::thread([this, hostility] {
        client_ = ::accept(listener_, nullptr, nullptr);
        if (client_ >= 0)
            doIt(client_, hostility);
    });
}

HostileService::~HostileService() {
    // Wakes the thread, wherever it waits.
    ::shutdown(listener_, SHUT_RDWR);
    if (client_ >= 0)
        ::shutdown(client_, SHUT_RDWR);
    thread_.join();
    if (client_ >= 0)
        ::close(client_);
    ::close(listener_);
}

} // namespace VLServiceTest
