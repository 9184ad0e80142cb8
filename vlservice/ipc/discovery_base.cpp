#include "vlservice/ipc/discovery_base.h"

#include "vlservice/json/json_text.h"
#include "vlservice/platform/log.h"

#include <boost/asio/buffer.hpp>
#include <boost/asio/error.hpp>
#include <boost/asio/ip/multicast.hpp>
#include <boost/asio/post.hpp>

#include <exception>
#include <sstream>
#include <string_view>

namespace Ipc {

namespace asio = boost::asio;
using asio::ip::udp;
using boost::system::error_code;

namespace {

constexpr LogPriority BROKEN = 3;
constexpr LogPriority FAILED = 4;
constexpr LogPriority TRACE = 7;

/// What recvAll logs of datagrams that it drops, at the most, in a time.
constexpr int MAX_LINES = 10;
constexpr std::chrono::seconds LINES_TIME{10};

void logFailure(LogPriority priority, std::string_view what, std::string_view reason) {
    Log::Lock log(priority);
    log.logStreamLine() << what << reason;
}

void trace(udp::endpoint const& sender, std::string_view event, std::string_view text = {}) {
    if (!g_LogVerbose)
        return;
    Log::Lock log(TRACE);
    log.logStreamLine() << "Discovery " << sender.address().to_string() << event << text;
}

} // namespace

DiscoveryBase::DiscoveryBase(asio::io_context& io, bool ipv4)
    : io_(io), multicastAddr_(asio::ip::make_address(ipv4 ? MULTICAST_ADDR_IP4 : MULTICAST_ADDR_IP6)),
      alive_(std::make_shared<char>()) {
    try {
        open();
    } catch (std::exception const& e) {
        if (ipv4)
            logFailure(BROKEN, "Discovery failed to initialize. ", e.what());
        else if (g_LogVerbose)
            logFailure(TRACE, "Discovery failed to open IPv6 socket. ", e.what());
    }
}

void DiscoveryBase::open() {
    udp const family = multicastAddr_.is_v4() ? udp::v4() : udp::v6();
    socket_ = std::make_unique<udp::socket>(io_);
    socket_->open(family);
    socket_->set_option(udp::socket::reuse_address(true));
    socket_->bind(udp::endpoint(family, DISCOVERY_PORT));
    socket_->set_option(asio::ip::multicast::join_group(multicastAddr_));
}

bool DiscoveryBase::isOpen() { return socket_ && socket_->is_open(); }

template<typename Handler>
auto DiscoveryBase::guarded(Handler handler) {
    return [alive = std::weak_ptr(alive_), handler](error_code const& ec, std::uint64_t bytes = 0) {
        if (!alive.expired())
            handler(ec, bytes);
    };
}

void DiscoveryBase::send(json::Object const& object) {
    if (closed_)
        return;
    std::ostringstream text;
    text << object;
    sendBuf_ = std::move(text).str();
    trace(senderEndpoint_, " sending msg: ", sendBuf_);
    auto const done = guarded([this](error_code const& ec, std::uint64_t) { handleSend(ec); });
    if (socket_)
        socket_->async_send_to(asio::buffer(sendBuf_), udp::endpoint(multicastAddr_, DISCOVERY_PORT), done);
    else
        asio::post(io_, [done] { done(asio::error::bad_descriptor); });
}

void DiscoveryBase::recv(RcvFunc func) {
    if (closed_)
        return;
    rcvFunc_ = std::move(func);
    auto const done =
        guarded([this](error_code const& ec, std::uint64_t bytes) { handleReceive(ec, bytes); });
    if (socket_)
        socket_->async_receive_from(asio::buffer(rcvBuf_), senderEndpoint_, done);
    else
        asio::post(io_, [done] { done(asio::error::bad_descriptor); });
}

void DiscoveryBase::recv(RcvFunc func, boost::posix_time::time_duration timeout) {
    if (closed_)
        return;
    recv(std::move(func));
    if (timer_)
        timer_->cancel();
    timer_ = std::make_unique<asio::deadline_timer>(io_, timeout);
    timer_->async_wait(guarded([this, generation = ++timerGeneration_](error_code const& ec, std::uint64_t) {
        handleTimeout(generation == timerGeneration_ ? ec : asio::error::operation_aborted);
    }));
}

void DiscoveryBase::recvAll(RcvFunc func) {
    allFunc_ = func;
    recv(std::move(func));
}

void DiscoveryBase::close() {
    if (closed_.exchange(true))
        return;
    if (socket_) {
        socket_->close();
        socket_.reset();
    }
    if (timer_) {
        timer_->cancel();
        timer_.reset();
    }
}

json::Object DiscoveryBase::makeReq() { return {{REQ_FIELD_NAME.c_str(), true}}; }

bool DiscoveryBase::isReq(json::Object const& object) { return object.get(REQ_FIELD_NAME).isTrue(); }

void DiscoveryBase::handleSend(error_code const& ec) {
    if (ec && !closed_)
        logFailure(FAILED, "Discovery send operation failed. ", ec.message());
}

void DiscoveryBase::handleReceive(error_code const& ec, std::uint64_t bytes) {
    if (closed_)
        return;
    if (ec) {
        logFailure(FAILED, "Discovery receive operation failed. ", ec.message());
        return;
    }
    std::string const text(rcvBuf_.data(), bytes);
    // The odd spelling is the interface's: programs that read the log know the line so.
    trace(senderEndpoint_, " recevied msg: ", text);
    std::weak_ptr const alive(alive_);
    callRcvFunc(text);
    if (!alive.expired() && allFunc_)
        recv(allFunc_);
}

void DiscoveryBase::handleTimeout(error_code const& ec) {
    if (closed_ || ec)
        return;
    trace(senderEndpoint_, " timed out");
    std::weak_ptr const alive(alive_);
    callRcvFunc("{}");
    if (!alive.expired() && isOpen())
        socket_->cancel();
}

void DiscoveryBase::callRcvFunc(std::string const& text) {
    try {
        // A copy: the callback replaces the function when it calls recv, and may destroy this object.
        RcvFunc const func = rcvFunc_;
        func(json::strToObject(text.data(), text.size()));
    } catch (std::exception const& e) {
        logDropped(e.what());
    }
}

void DiscoveryBase::logDropped(char const* reason) {
    auto const now = std::chrono::steady_clock::now();
    if (now >= linesEnd_) {
        linesEnd_ = now + LINES_TIME;
        linesLogged_ = 0;
    }
    // Whoever is on the network may send as much as he likes to one who receives for ever.
    if (allFunc_ && ++linesLogged_ > MAX_LINES)
        return;
    logFailure(BROKEN, "Discovery receive operation failed to deserialize or process the message. ", reason);
}

} // namespace Ipc
