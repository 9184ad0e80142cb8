#include "programs/vlmail/service/multicast_probe.h"

#include "vlservice/ipc/discovery_base.h"
#include "vlservice/json/json_text.h"

#include <utility>

#include <boost/asio/buffer.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/multicast.hpp>
#include <boost/asio/ip/udp.hpp>
#include <boost/asio/ip/v6_only.hpp>

#include <algorithm>
#include <array>
#include <ifaddrs.h>
#include <memory>
#include <net/if.h>
#include <netinet/in.h>
#include <optional>
#include <set>
#include <sstream>

namespace VlMail {
namespace {

namespace asio = boost::asio;
namespace multicast = asio::ip::multicast;
using asio::ip::udp;
using boost::system::error_code;

// The groups of the discovery protocol.
constexpr char const* GROUP_IP4 = "239.4.5.6";
constexpr char const* GROUP_IP6 = "ff45:6:45:6:45:6:45:6";
constexpr std::size_t MAX_DATAGRAM = 1024;

/// Without the zone, which other hosts name differently.
asio::ip::address withoutZone(asio::ip::address const& address) {
    return address.is_v6() ? asio::ip::address_v6(address.to_v6().to_bytes()) : address;
}

/// A socket hears the groups that it has joined itself, and not what others of this host have joined.
template<int Level, int Name>
class OwnGroupsOnly {
public:
    template<typename Protocol>
    int level(Protocol const&) const {
        return Level;
    }
    template<typename Protocol>
    int name(Protocol const&) const {
        return Name;
    }
    template<typename Protocol>
    int const* data(Protocol const&) const {
        return &hearsAll_;
    }
    template<typename Protocol>
    std::size_t size(Protocol const&) const {
        return sizeof hearsAll_;
    }

private:
    int hearsAll_ = 0;
};

struct InterfaceAddress {
    std::string interface;
    asio::ip::address address;
};

/// A step of setting up or sending that failed.
struct ProbeFailure {
    std::string what;
};

/// A socket of discovery that is bound to one interface.
class Probe {
public:
    /// `ownAddresses` outlives it.
    Probe(asio::io_context& io, InterfaceAddress const& at, std::set<asio::ip::address> const& ownAddresses)
        : socket_(io), address_(at.address), ownAddresses_(ownAddresses) {
        report.interface = at.interface;
        report.address = at.address.to_string();
        report.isIp6 = at.address.is_v6();
        try {
            open();
            join();
            send();
            receive();
        } catch (ProbeFailure const& failure) {
            report.failure = failure.what;
        }
    }
    Probe(Probe const&) = delete;
    Probe& operator=(Probe const&) = delete;

    ProbeReport report;

private:
    /// Does one step with an error code to fill.
    template<typename Step>
    static void require(char const* name, Step step) {
        error_code ec;
        step(ec);
        if (ec)
            throw ProbeFailure{std::string(name) + ": " + ec.message()};
    }
    template<typename Option>
    void set(char const* name, Option const& option) {
        require(name, [&](error_code& ec) { socket_.set_option(option, ec); });
    }

    void open() {
        udp const family = report.isIp6 ? udp::v6() : udp::v4();
        require("open", [&](error_code& ec) { socket_.open(family, ec); });
        set("share the port", udp::socket::reuse_address(true));
        if (report.isIp6)
            set("keep to IPv6", asio::ip::v6_only(true));
        require("bind to the port", [&](error_code& ec) {
            socket_.bind(udp::endpoint(family, Ipc::DiscoveryBase::DISCOVERY_PORT), ec);
        });
    }

    void join() {
        if (report.isIp6) {
            unsigned const index = ::if_nametoindex(report.interface.c_str());
            set("separate the interfaces", OwnGroupsOnly<IPPROTO_IPV6, IPV6_MULTICAST_ALL>());
            set("join the group", multicast::join_group(group().to_v6(), index));
            set("choose the interface", multicast::outbound_interface(index));
        } else {
            set("separate the interfaces", OwnGroupsOnly<IPPROTO_IP, IP_MULTICAST_ALL>());
            set("join the group", multicast::join_group(group().to_v4(), address_.to_v4()));
            set("choose the interface", multicast::outbound_interface(address_.to_v4()));
        }
    }

    asio::ip::address group() const { return asio::ip::make_address(report.isIp6 ? GROUP_IP6 : GROUP_IP4); }

    void send() {
        std::ostringstream text;
        text << Ipc::DiscoveryBase::makeReq();
        std::string const bytes = text.str();
        require("send", [&](error_code& ec) {
            socket_.send_to(asio::buffer(bytes), udp::endpoint(group(), Ipc::DiscoveryBase::DISCOVERY_PORT),
                            0, ec);
        });
    }

    void receive() {
        socket_.async_receive_from(asio::buffer(bytes_), sender_,
                                   [this](error_code const& ec, std::size_t size) {
                                       if (ec)
                                           return;
                                       note(std::string(bytes_.data(), size));
                                       receive();
                                   });
    }

    void note(std::string const& text) {
        try {
            json::Object const datagram = json::strToObject(text.data(), text.size());
            if (Ipc::DiscoveryBase::isReq(datagram))
                report.heardItself |= ownAddresses_.contains(withoutZone(sender_.address()));
            else
                noteAnswer(datagram);
        } catch (json::Exc const&) {
            ++report.foreign;
        }
    }

    void noteAnswer(json::Object const& datagram) {
        std::string const host = datagram.get(Ipc::DiscoveryBase::SVC_HOST_FLD_NAME).textOrEmpty();
        std::string const port =
            std::to_string(datagram.get(Ipc::DiscoveryBase::SVC_PORT_FLD_NAME).intOrZero());
        if (host.empty() || port == "0") {
            ++report.foreign;
            return;
        }
        std::string answer = host + ':' + port + " (from " + withoutZone(sender_.address()).to_string() + ')';
        if (std::find(report.answers.begin(), report.answers.end(), answer) == report.answers.end())
            report.answers.push_back(std::move(answer));
    }

    udp::socket socket_;
    asio::ip::address address_;
    std::set<asio::ip::address> const& ownAddresses_;
    udp::endpoint sender_;
    std::array<char, MAX_DATAGRAM> bytes_;
};

std::optional<asio::ip::address> addressOf(sockaddr const* address) {
    if (address && address->sa_family == AF_INET)
        return asio::ip::address_v4(ntohl(reinterpret_cast<sockaddr_in const*>(address)->sin_addr.s_addr));
    if (!address || address->sa_family != AF_INET6)
        return std::nullopt;
    asio::ip::address_v6::bytes_type bytes;
    std::copy_n(reinterpret_cast<sockaddr_in6 const*>(address)->sin6_addr.s6_addr, bytes.size(),
                bytes.begin());
    return asio::ip::address_v6(bytes);
}

/// One address for each interface and IP version; all own addresses go into `own`.
std::vector<InterfaceAddress> interfacesThatAreUp(std::set<asio::ip::address>& own) {
    ifaddrs* list = nullptr;
    if (::getifaddrs(&list) != 0)
        return {};
    std::vector<InterfaceAddress> found;
    for (ifaddrs const* at = list; at; at = at->ifa_next) {
        std::optional<asio::ip::address> const address = addressOf(at->ifa_addr);
        if (!address || (at->ifa_flags & IFF_UP) == 0)
            continue;
        own.insert(*address);
        bool const isKnown = std::any_of(found.begin(), found.end(), [&](InterfaceAddress const& other) {
            return other.interface == at->ifa_name && other.address.is_v6() == address->is_v6();
        });
        if (!isKnown)
            found.push_back({at->ifa_name, *address});
    }
    ::freeifaddrs(list);
    return found;
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
    asio::io_context io(1);
    std::set<asio::ip::address> own;
    std::vector<InterfaceAddress> const interfaces = interfacesThatAreUp(own);
    std::vector<std::unique_ptr<Probe>> probes;
    for (InterfaceAddress const& at : interfaces)
        probes.push_back(std::make_unique<Probe>(io, at, own));
    io.run_for(time);
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
