#pragma once
// Where browsers of this machine come in: a port of the loopback address.

#include "programs/vlmail/workbench/answer.h"
#include "programs/vlmail/workbench/request.h"

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>

namespace boost::asio {
class io_context;
} // namespace boost::asio

namespace VlMail::Workbench {

/// How long a peer may take.
struct PeerTimes {
    /// From the first byte of a request to its last, and to take the answer.
    std::chrono::milliseconds request = std::chrono::seconds(10);
    /// Between two requests.
    std::chrono::milliseconds idle = std::chrono::minutes(2);
};

/// Everything happens on the thread that runs the io_context.
class Door {
public:
    /// More than a browser opens for two tabs. Beyond them the one goes that has waited for the longest.
    static constexpr std::size_t MAX_PEERS = 64;

    /// Ends a request; called once, at any time, also when the peer has gone.
    using Respond = std::function<void(Answer)>;
    using Handler = std::function<void(Request, Respond)>;

    /// Listens from now on at a port that the system chooses. Throws Error.
    explicit Door(boost::asio::io_context& io, PeerTimes times = {});
    ~Door();
    Door(Door const&) = delete;
    Door& operator=(Door const&) = delete;

    std::uint16_t port() const;
    /// Answers from now on. Requests of one connection come one behind the other.
    void open(Handler handler);

private:
    class Impl;
    std::shared_ptr<Impl> impl_;
};

} // namespace VlMail::Workbench
