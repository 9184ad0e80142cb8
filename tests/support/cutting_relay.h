#pragma once
// A relay between a client and a server, which cuts connections where the test wants it.

#include <cstdint>
#include <functional>
#include <list>
#include <mutex>
#include <thread>

namespace VLServiceTest {

/// Listens on a port of its own, on loopback unless it is told another address, and passes on what comes by,
/// piece by piece, in a thread of its own.
class CuttingRelay {
public:
    static constexpr char const* LOOPBACK = "127.0.0.1";

    /// Gives a socket to the server; called for each connection, in the relay's thread.
    using Connect = std::function<int()>;
    /// Called before a piece is passed on, with its number from 1 on over all connections; false cuts the
    /// connection in its place.
    using OnPiece = std::function<bool(int piece)>;

    explicit CuttingRelay(Connect connect, char const* host = LOOPBACK);
    ~CuttingRelay();
    CuttingRelay(CuttingRelay const&) = delete;
    CuttingRelay& operator=(CuttingRelay const&) = delete;

    std::uint16_t port() const { return port_; }
    /// Counts from 1 again.
    void onPiece(OnPiece onPiece);
    /// How many have come since.
    int pieces() const;

private:
    struct Connection {
        int client;
        int server;
    };

    void run();
    void accept();
    /// False when the connection is at its end.
    bool pass(int from, int to);
    bool isAllowed();

    Connect connect_;
    int listener_;
    int wake_[2];
    std::uint16_t port_ = 0;
    std::list<Connection> connections_;
    mutable std::mutex mutex_;
    OnPiece onPiece_;
    int pieces_ = 0;
    std::thread thread_;
};

/// A socket to a port; below 0 when nobody listens there.
int connectedTo(std::uint16_t port, char const* host = CuttingRelay::LOOPBACK);

} // namespace VLServiceTest
