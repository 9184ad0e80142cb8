#pragma once
// One multicast UDP socket with JSON objects in and out: what service discovery stands on, on both sides.

#include "vlservice/export.h"
#include "vlservice/json/json.h"

#include <utility>

#include <boost/asio/deadline_timer.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/address.hpp>
#include <boost/asio/ip/udp.hpp>
#include <boost/date_time/posix_time/posix_time_types.hpp>

#include <array>
#include <atomic>
#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>

namespace Ipc {

/// A datagram is the text of one JSON object, of at most 1024 bytes. Each receive is for one datagram:
/// whoever wants the next calls recv again, usually from its callback. At most one send may be in flight. The
/// io_context is run by a single thread and outlives this object. Destroying the object, also from its own
/// callback, ends what is pending: no callback comes afterwards.
class VLSERVICE_EXPORT DiscoveryBase {
public:
    using RcvFunc = std::function<void(json::Object)>; ///< takes what was received

    /// Keys of a service's answer.
    inline static std::string const SVC_HOST_FLD_NAME = "host";
    inline static std::string const SVC_PORT_FLD_NAME = "port"; ///< as a number
    static constexpr std::uint16_t DISCOVERY_PORT = 45677;      ///< UDP, of the group

    /// Opens the socket and joins the group. A failure is logged, for IPv6 only under g_LogVerbose since a
    /// host may well have none, and leaves the object as far as it got.
    DiscoveryBase(boost::asio::io_context& io, bool ipv4);

    bool isOpen(); ///< it can send and receive

    /// Sends to the group. An object that cannot be printed throws json::Exc.
    void send(json::Object const& object);
    /// One receive, without a limit in time. A function from before is replaced.
    void recv(RcvFunc func);
    /// When the time is up, an empty object is received and what else is pending is cancelled. The time goes
    /// on after a datagram: only another timed receive, or close, ends it.
    void recv(RcvFunc func, boost::posix_time::time_duration timeout);
    /// For a service: receives one datagram after another until close(). What is no JSON object, and what
    /// `func` throws, is passed over and logged, at most ten times in ten seconds. A failure of the socket
    /// ends it.
    void recvAll(RcvFunc func);
    /// Nothing is sent or received any more. A second call does nothing.
    void close();

    static json::Object makeReq();                 ///< what a client asks with
    static bool isReq(json::Object const& object); ///< what makeReq() gives

private:
    friend struct DiscoveryTestAccess;

    inline static std::string const MULTICAST_ADDR_IP4 = "239.4.5.6";
    inline static std::string const MULTICAST_ADDR_IP6 = "ff45:6:45:6:45:6:45:6";
    inline static std::string const REQ_FIELD_NAME = "#req";
    static constexpr std::uint64_t MAX_RCV_LENGTH = 1024;

    void open();
    /// The handler with a guard in front: it runs only while this object lives.
    template<typename Handler>
    auto guarded(Handler handler);

    void handleSend(boost::system::error_code const& ec);
    void handleReceive(boost::system::error_code const& ec, std::uint64_t bytes);
    void handleTimeout(boost::system::error_code const& ec);
    /// The callback may destroy this object.
    void callRcvFunc(std::string const& text);
    void logDropped(char const* reason);

    boost::asio::io_context& io_;
    boost::asio::ip::address multicastAddr_;
    std::unique_ptr<boost::asio::ip::udp::socket> socket_;
    boost::asio::ip::udp::endpoint senderEndpoint_;
    std::array<char, MAX_RCV_LENGTH> rcvBuf_;
    std::string sendBuf_;
    RcvFunc rcvFunc_;
    /// Of recvAll: it is received for again after each datagram.
    RcvFunc allFunc_;
    /// What recvAll has logged in the ten seconds that end then.
    int linesLogged_ = 0;
    std::chrono::steady_clock::time_point linesEnd_;
    std::unique_ptr<boost::asio::deadline_timer> timer_;
    /// Tells the newest timer's handler from that of a former one that had expired before it could be
    /// cancelled.
    std::uint64_t timerGeneration_ = 0;
    std::atomic<bool> closed_ = false;
    /// Expires first of all; the handlers watch it.
    std::shared_ptr<void> alive_;
};

} // namespace Ipc
