#include "tests/support/two_networks.h"

#include <fcntl.h>
#include <netdb.h>
#include <sched.h>
#include <sys/socket.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <stdexcept>
#include <system_error>
#include <thread>
#include <utility>

namespace {

/// What the command printed when it failed; empty when it did not.
std::string failureOf(std::string const& command) {
    FILE* const pipe = ::popen((command + " 2>&1").c_str(), "r");
    if (!pipe)
        return "cannot run " + command;
    std::string output;
    std::array<char, 256> buffer;
    while (std::size_t const got = std::fread(buffer.data(), 1, buffer.size(), pipe))
        output.append(buffer.data(), got);
    return ::pclose(pipe) == 0 ? std::string() : command + ": " + output;
}

void enter(int network) {
    if (::setns(network, CLONE_NEWNET) != 0)
        throw std::system_error(errno, std::generic_category(), "setns");
}

int openOrThrow(std::string const& path) {
    int const file = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (file < 0)
        throw std::system_error(errno, std::generic_category(), path);
    return file;
}

/// Whether a datagram to that group's discard port leaves the namespace of this thread.
bool canSendTo(char const* group) {
    addrinfo hints{};
    hints.ai_flags = AI_NUMERICHOST;
    hints.ai_socktype = SOCK_DGRAM;
    addrinfo* found = nullptr;
    if (::getaddrinfo(group, "9", &hints, &found) != 0)
        return false;
    int const socket = ::socket(found->ai_family, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    bool const sent = ::sendto(socket, "", 0, 0, found->ai_addr, found->ai_addrlen) == 0;
    ::close(socket);
    ::freeaddrinfo(found);
    return sent;
}

} // namespace

TwoNetworks::TwoNetworks() { make(); }

TwoNetworks::~TwoNetworks() {
    // The interfaces go with their namespaces.
    for (std::string const& network : {client_, service_})
        failureOf("ip netns del " + network);
}

void TwoNetworks::make() {
    run("ip netns add " + client_);
    run("ip netns add " + service_);
    run("ip -n " + client_ + " link add vl0 type veth peer name vl0 netns " + service_);
    std::pair<std::string, std::string> const ends[] = {{client_, "1"}, {service_, "2"}};
    for (auto const& [network, number] : ends) {
        run("ip -n " + network + " link set lo up");
        run("ip -n " + network + " address add 10.77.0." + number + "/24 dev vl0");
        run("ip -n " + network + " address add fd77::" + number + "/64 dev vl0 nodad");
        run("ip netns exec " + network + " sysctl -qw net.ipv6.conf.vl0.accept_dad=0");
        run("ip -n " + network + " link set vl0 up");
        run("ip -n " + network + " route add 239.0.0.0/8 dev vl0");
    }
    for (std::string const& network : {client_, service_})
        if (whyNot_.empty())
            awaitMulticast(network);
}

void TwoNetworks::awaitMulticast(std::string const& network) {
    Inside const inside(network);
    auto const deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
    for (char const* const group : {"239.4.5.7", "ff45:6:45:6:45:6:45:7"}) {
        while (!canSendTo(group)) {
            if (std::chrono::steady_clock::now() > deadline)
                throw std::runtime_error("The interfaces of " + network + " do not become ready.");
            std::this_thread::yield();
        }
    }
}

void TwoNetworks::disableIp6(std::string const& network) {
    run("ip netns exec " + network + " sysctl -qw net.ipv6.conf.all.disable_ipv6=1");
}

void TwoNetworks::run(std::string const& command) {
    if (whyNot_.empty())
        whyNot_ = failureOf(command);
}

TwoNetworks::Inside::Inside(std::string const& network) : before_(openOrThrow("/proc/thread-self/ns/net")) {
    int const target = openOrThrow("/run/netns/" + network);
    enter(target);
    ::close(target);
}

TwoNetworks::Inside::~Inside() {
    enter(before_);
    ::close(before_);
}
