#include "programs/vlmail/service/multicast_probe.h"

#include "vlservice/ipc/discovery_base.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <arpa/inet.h>
#include <array>
#include <cerrno>
#include <cstring>
#include <ifaddrs.h>
#include <memory>
#include <net/if.h>
#include <netinet/in.h>
#include <optional>
#include <poll.h>
#include <set>
#include <sstream>
#include <sys/socket.h>
#include <unistd.h>
#include <utility>

namespace VlMail {
namespace {

// The groups of the discovery protocol.
constexpr char const* GROUP_IP4 = "239.4.5.6";
constexpr char const* GROUP_IP6 = "ff45:6:45:6:45:6:45:6";
constexpr std::size_t MAX_DATAGRAM = 1024;

std::string addressText(sockaddr const* address) {
    char text[INET6_ADDRSTRLEN] = {};
    if (address->sa_family == AF_INET)
        ::inet_ntop(AF_INET, &reinterpret_cast<sockaddr_in const*>(address)->sin_addr, text, sizeof text);
    else
        ::inet_ntop(AF_INET6, &reinterpret_cast<sockaddr_in6 const*>(address)->sin6_addr, text, sizeof text);
    return text;
}

/// A step of setting up or sending that failed.
struct ProbeFailure {
    std::string what;
};

void require(int result, char const* step) {
    if (result < 0)
        throw ProbeFailure{std::string(step) + ": " + std::strerror(errno)};
}

template<typename Value>
void setOption(int socket, int level, int name, Value const& value, char const* step) {
    require(::setsockopt(socket, level, name, &value, sizeof value), step);
}

/// A socket of discovery that is bound to one interface.
class Probe {
public:
    Probe(std::string interface, std::string address, bool isIp6) {
        report.interface = std::move(interface);
        report.address = std::move(address);
        report.isIp6 = isIp6;
        try {
            open();
            join();
            send();
        } catch (ProbeFailure const& failure) {
            report.failure = failure.what;
        }
    }
    ~Probe() {
        if (socket_ >= 0)
            ::close(socket_);
    }
    Probe(Probe const&) = delete;
    Probe& operator=(Probe const&) = delete;

    int socket() const { return report.failure.empty() ? socket_ : -1; }

    void receive(std::set<std::string> const& ownAddresses) {
        std::array<char, MAX_DATAGRAM> bytes;
        sockaddr_storage sender{};
        socklen_t length = sizeof sender;
        ssize_t const size = ::recvfrom(socket_, bytes.data(), bytes.size(), MSG_DONTWAIT,
                                        reinterpret_cast<sockaddr*>(&sender), &length);
        if (size >= 0)
            note(std::string(bytes.data(), static_cast<std::size_t>(size)),
                 addressText(reinterpret_cast<sockaddr*>(&sender)), ownAddresses);
    }

    ProbeReport report;

private:
    void open() {
        socket_ = ::socket(report.isIp6 ? AF_INET6 : AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0);
        require(socket_, "open");
        setOption(socket_, SOL_SOCKET, SO_REUSEADDR, 1, "share the port");
        if (report.isIp6)
            setOption(socket_, IPPROTO_IPV6, IPV6_V6ONLY, 1, "keep to IPv6");
        sockaddr_in6 any6{};
        any6.sin6_family = AF_INET6;
        any6.sin6_port = htons(Ipc::DiscoveryBase::DISCOVERY_PORT);
        sockaddr_in any4{};
        any4.sin_family = AF_INET;
        any4.sin_port = any6.sin6_port;
        require(report.isIp6 ? ::bind(socket_, reinterpret_cast<sockaddr*>(&any6), sizeof any6)
                             : ::bind(socket_, reinterpret_cast<sockaddr*>(&any4), sizeof any4),
                "bind to the port");
    }

    /// Only this interface's group: without that each socket hears what another one has joined.
    void join() {
        int const index = static_cast<int>(::if_nametoindex(report.interface.c_str()));
        if (report.isIp6) {
            ipv6_mreq request{};
            ::inet_pton(AF_INET6, GROUP_IP6, &request.ipv6mr_multiaddr);
            request.ipv6mr_interface = static_cast<unsigned>(index);
            setOption(socket_, IPPROTO_IPV6, IPV6_MULTICAST_ALL, 0, "separate the interfaces");
            setOption(socket_, IPPROTO_IPV6, IPV6_JOIN_GROUP, request, "join the group");
            setOption(socket_, IPPROTO_IPV6, IPV6_MULTICAST_IF, index, "choose the interface");
        } else {
            ip_mreqn request{};
            ::inet_pton(AF_INET, GROUP_IP4, &request.imr_multiaddr);
            request.imr_ifindex = index;
            setOption(socket_, IPPROTO_IP, IP_MULTICAST_ALL, 0, "separate the interfaces");
            setOption(socket_, IPPROTO_IP, IP_ADD_MEMBERSHIP, request, "join the group");
            setOption(socket_, IPPROTO_IP, IP_MULTICAST_IF, request, "choose the interface");
        }
    }

    void send() {
        std::ostringstream text;
        text << Ipc::DiscoveryBase::makeReq();
        std::string const bytes = text.str();
        sockaddr_in6 group6{};
        group6.sin6_family = AF_INET6;
        group6.sin6_port = htons(Ipc::DiscoveryBase::DISCOVERY_PORT);
        ::inet_pton(AF_INET6, GROUP_IP6, &group6.sin6_addr);
        sockaddr_in group4{};
        group4.sin_family = AF_INET;
        group4.sin_port = group6.sin6_port;
        ::inet_pton(AF_INET, GROUP_IP4, &group4.sin_addr);
        ssize_t const sent = report.isIp6 ? ::sendto(socket_, bytes.data(), bytes.size(), 0,
                                                     reinterpret_cast<sockaddr*>(&group6), sizeof group6)
                                          : ::sendto(socket_, bytes.data(), bytes.size(), 0,
                                                     reinterpret_cast<sockaddr*>(&group4), sizeof group4);
        require(static_cast<int>(sent), "send");
    }

    void note(std::string const& text, std::string const& sender, std::set<std::string> const& ownAddresses) {
        try {
            json::Object const datagram = json::strToObject(text.data(), text.size());
            if (Ipc::DiscoveryBase::isReq(datagram))
                report.heardItself |= ownAddresses.contains(sender);
            else
                noteAnswer(datagram, sender);
        } catch (json::Exc const&) {
            ++report.foreign;
        }
    }

    void noteAnswer(json::Object const& datagram, std::string const& sender) {
        std::string const host = datagram.get(Ipc::DiscoveryBase::SVC_HOST_FLD_NAME).textOrEmpty();
        std::string const port =
            std::to_string(datagram.get(Ipc::DiscoveryBase::SVC_PORT_FLD_NAME).intOrZero());
        if (host.empty() || port == "0") {
            ++report.foreign;
            return;
        }
        std::string answer = host + ':' + port + " (from " + sender + ')';
        if (std::find(report.answers.begin(), report.answers.end(), answer) == report.answers.end())
            report.answers.push_back(std::move(answer));
    }

    int socket_ = -1;
};

using Probes = std::vector<std::unique_ptr<Probe>>;

struct InterfaceAddress {
    std::string interface;
    std::string address;
    bool isIp6;
};

/// One address for each interface and IP version; all own addresses go into `own`.
std::vector<InterfaceAddress> interfacesThatAreUp(std::set<std::string>& own) {
    ifaddrs* list = nullptr;
    if (::getifaddrs(&list) != 0)
        return {};
    std::vector<InterfaceAddress> found;
    for (ifaddrs const* at = list; at; at = at->ifa_next) {
        bool const isIp =
            at->ifa_addr && (at->ifa_addr->sa_family == AF_INET || at->ifa_addr->sa_family == AF_INET6);
        if (!isIp || (at->ifa_flags & IFF_UP) == 0)
            continue;
        InterfaceAddress const address{at->ifa_name, addressText(at->ifa_addr),
                                       at->ifa_addr->sa_family == AF_INET6};
        own.insert(address.address);
        bool const isKnown = std::any_of(found.begin(), found.end(), [&](InterfaceAddress const& other) {
            return other.interface == address.interface && other.isIp6 == address.isIp6;
        });
        if (!isKnown)
            found.push_back(address);
    }
    ::freeifaddrs(list);
    return found;
}

void listen(Probes const& probes, std::set<std::string> const& own, std::chrono::milliseconds time) {
    auto const end = std::chrono::steady_clock::now() + time;
    std::vector<pollfd> waiting;
    for (auto const& probe : probes)
        waiting.push_back({probe->socket(), POLLIN, 0});
    for (;;) {
        auto const left =
            std::chrono::duration_cast<std::chrono::milliseconds>(end - std::chrono::steady_clock::now());
        if (left.count() <= 0 || ::poll(waiting.data(), waiting.size(), static_cast<int>(left.count())) <= 0)
            return;
        for (std::size_t i = 0; i < waiting.size(); ++i)
            if (waiting[i].revents != 0)
                probes[i]->receive(own);
    }
}

bool isLoopback(ProbeReport const& report) {
    return report.address == "127.0.0.1" || report.address == "::1";
}

std::string where(ProbeReport const& report) {
    return report.interface + (report.isIp6 ? " (IPv6)" : " (IPv4)");
}

std::optional<std::string> hintFor(ProbeReport const& report) {
    if (isLoopback(report))
        return std::nullopt;
    if (!report.failure.empty())
        return where(report) +
               ": the request could not be sent. Has the interface a route for multicast? (ip route)";
    if (!report.heardItself)
        return where(report) +
               ": the request did not come back to this host. A firewall here may hold up UDP port " +
               std::to_string(Ipc::DiscoveryBase::DISCOVERY_PORT) + '.';
    return where(report) +
           ": the request went out and nobody answered. A service answers only in the same network, "
           "and a firewall there may hold up UDP port " +
           std::to_string(Ipc::DiscoveryBase::DISCOVERY_PORT) + '.';
}

json::Array arrayOf(std::vector<std::string> const& texts) {
    json::Array array;
    for (std::string const& text : texts)
        array.append(text);
    return array;
}

} // namespace

std::vector<ProbeReport> probeNetwork(std::chrono::milliseconds time) {
    std::set<std::string> own;
    Probes probes;
    for (auto const& [interface, address, isIp6] : interfacesThatAreUp(own))
        probes.push_back(std::make_unique<Probe>(interface, address, isIp6));
    listen(probes, own, time);
    std::vector<ProbeReport> reports;
    for (auto const& probe : probes)
        reports.push_back(std::move(probe->report));
    return reports;
}

std::vector<std::string> hintsFor(std::vector<ProbeReport> const& reports) {
    if (std::any_of(reports.begin(), reports.end(), [](ProbeReport const& r) { return !r.answers.empty(); }))
        return {};
    std::vector<std::string> hints;
    if (std::all_of(reports.begin(), reports.end(), isLoopback))
        hints.emplace_back("No network interface is up but loopback: connect this host to a network.");
    for (ProbeReport const& report : reports)
        if (std::optional<std::string> hint = hintFor(report))
            hints.push_back(std::move(*hint));
    hints.emplace_back(
        "Without discovery, name the service with --service HOST:PORT; it prints its port when it "
        "starts.");
    return hints;
}

json::Object toJson(std::vector<ProbeReport> const& reports) {
    json::Array interfaces;
    for (ProbeReport const& report : reports) {
        json::Object object{
            {"interface", report.interface}, {"address", report.address}, {"ipv6", report.isIp6}};
        if (!report.failure.empty())
            object.set("failure", report.failure);
        object.set("heard_itself", report.heardItself);
        object.set("answers", arrayOf(report.answers));
        object.set("foreign", report.foreign);
        interfaces.append(object);
    }
    return {{"interfaces", interfaces}, {"hints", arrayOf(hintsFor(reports))}};
}

} // namespace VlMail
