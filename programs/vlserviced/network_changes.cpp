#include "programs/vlserviced/network_changes.h"

#include "vlservice/platform/log.h"

#include <boost/asio/buffer.hpp>
#include <boost/asio/error.hpp>

#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <system_error>

namespace VlServiced {
namespace {

/// One change comes as several events.
constexpr std::chrono::milliseconds PAUSE{300};

/// Gives -1 with errno when there is none to be had.
int openEvents() {
    int const events = ::socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC | SOCK_NONBLOCK, NETLINK_ROUTE);
    sockaddr_nl address{};
    address.nl_family = AF_NETLINK;
    address.nl_groups =
        RTMGRP_LINK | RTMGRP_IPV4_IFADDR | RTMGRP_IPV6_IFADDR | RTMGRP_IPV4_ROUTE | RTMGRP_IPV6_ROUTE;
    if (events >= 0 && ::bind(events, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0) {
        int const reason = errno;
        ::close(events);
        errno = reason;
        return -1;
    }
    return events;
}

} // namespace

NetworkChanges::NetworkChanges(boost::asio::io_context& io, std::function<void()> onChange)
    : events_(io), pause_(io), onChange_(std::move(onChange)) {
    int const events = openEvents();
    if (events < 0) {
        Log::Lock(4).logStreamLine() << "Discovery does not notice when the network changes: "
                                     << std::generic_category().message(errno) << '.';
        return;
    }
    events_.assign(events);
    listen();
}

void NetworkChanges::listen() {
    events_.async_read_some(
        boost::asio::buffer(room_),
        [this, alive = std::weak_ptr(alive_)](boost::system::error_code const& ec, std::size_t) {
            // Events that the system had no room for have happened all the same.
            if (alive.expired() || (ec && ec != boost::asio::error::no_buffer_space))
                return;
            awaitMore();
            listen();
        });
}

void NetworkChanges::awaitMore() {
    if (std::exchange(pausing_, true))
        return;
    pause_.expires_after(PAUSE);
    pause_.async_wait([this, alive = std::weak_ptr(alive_)](boost::system::error_code const& ec) {
        if (ec || alive.expired())
            return;
        pausing_ = false;
        onChange_();
    });
}

} // namespace VlServiced
