#include "tests/support/two_networks.h"

#include <fcntl.h>
#include <netdb.h>
#include <sched.h>
#include <sys/socket.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <fstream>
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
    return ::pclose(pipe) == 0 ? std::string() : "ip: " + output;
}

void enter(int network) {
    if (::setns(network, CLONE_NEWNET) != 0)
        throw std::system_error(errno, std::generic_category(), "setns");
}

/// The namespace of this thread; below 0 when it cannot be opened.
int openOwn() { return ::open("/proc/thread-self/ns/net", O_RDONLY | O_CLOEXEC); }

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

TwoNetworks::TwoNetworks() {
    makeNetwork(client_);
    makeNetwork(service_);
    if (whyNot_.empty())
        connect();
}

TwoNetworks::~TwoNetworks() {
    // The interfaces go with their namespaces.
    for (int const network : {client_, service_})
        ::close(network);
}

void TwoNetworks::makeNetwork(int& network) {
    std::thread([&] {
        if (::unshare(CLONE_NEWNET) == 0)
            network = openOwn();
        if (network < 0)
            whyNot_ = std::generic_category().message(errno);
    }).join();
}

void TwoNetworks::disconnect() { ip(client_, "link delete vl0"); }

void TwoNetworks::connect() {
    // A namespace without a name is told by the file that keeps it alive.
    std::string const peer = "/proc/" + std::to_string(::getpid()) + "/fd/" + std::to_string(service_);
    ip(client_, "link add vl0 type veth peer name vl0 netns " + peer);
    std::pair<int, std::string> const ends[] = {{client_, "1"}, {service_, "2"}};
    for (auto const& [network, number] : ends) {
        ip(network, "link set lo up");
        ip(network, "address add 10.77.0." + number + "/24 dev vl0");
        ip(network, "address add fd77::" + number + "/64 dev vl0 nodad");
        set(network, "ipv6/conf/vl0/accept_dad", '0');
        ip(network, "link set vl0 up");
        ip(network, "route add 239.0.0.0/8 dev vl0");
    }
    for (int const network : {client_, service_})
        if (whyNot_.empty())
            awaitMulticast(network);
}

void TwoNetworks::awaitMulticast(int network) {
    Inside const inside(network);
    auto const deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
    for (char const* const group : {"239.4.5.7", "ff45:6:45:6:45:6:45:7"}) {
        while (!canSendTo(group)) {
            if (std::chrono::steady_clock::now() > deadline)
                throw std::runtime_error("The interfaces do not become ready.");
            std::this_thread::yield();
        }
    }
}

void TwoNetworks::disableIp6(int network) { set(network, "ipv6/conf/all/disable_ipv6", '1'); }

void TwoNetworks::ip(int network, std::string const& arguments) {
    if (!whyNot_.empty())
        return;
    Inside const inside(network);
    whyNot_ = failureOf("ip " + arguments);
}

void TwoNetworks::set(int network, std::string const& name, char value) {
    if (!whyNot_.empty())
        return;
    Inside const inside(network);
    std::string const file = "/proc/sys/net/" + name;
    if (!(std::ofstream(file) << value << std::flush))
        whyNot_ = "cannot write " + file;
}

TwoNetworks::Inside::Inside(int network) : before_(openOwn()) { enter(network); }

TwoNetworks::Inside::~Inside() {
    enter(before_);
    ::close(before_);
}
