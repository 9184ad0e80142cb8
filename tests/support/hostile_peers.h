#pragma once
// Peers on loopback that do with a connection what nobody should: say nothing, stop in the middle, flood,
// forge answers.

#include <atomic>
#include <cstdint>
#include <iosfwd>
#include <string>
#include <thread>
#include <vector>

namespace VLServiceTest {

struct Hostility {
    /// Fit for the name of a test.
    std::string name;
    /// What is said, once or again and again.
    std::string bytes;
    /// Until the other side closes.
    bool isRepeated = false;
    /// Whether the connection stays open behind it, until the other side closes.
    bool stays = true;
};

inline void PrintTo(Hostility const& hostility, std::ostream* out) { *out << hostility.name; }

/// Against the protocol between client and service, from either side.
std::vector<Hostility> const& hostilities();

/// So many clients, each on a thread of its own, that do it with a service until it or the test leaves.
class HostileClients {
public:
    HostileClients(std::uint16_t port, Hostility const& hostility, int count);
    ~HostileClients();
    HostileClients(HostileClients const&) = delete;
    HostileClients& operator=(HostileClients const&) = delete;

private:
    std::vector<int> sockets_;
    std::vector<std::thread> threads_;
};

/// A service on a port of its own that does it with its first client.
class HostileService {
public:
    explicit HostileService(Hostility const& hostility);
    ~HostileService();
    HostileService(HostileService const&) = delete;
    HostileService& operator=(HostileService const&) = delete;

    std::uint16_t port() const { return port_; }

private:
    int listener_;
    std::uint16_t port_ = 0;
    std::atomic<int> client_ = -1;
    std::thread thread_;
};

} // namespace VLServiceTest
