#pragma once
// Answers clients that look for the service.

#include "vlservice/ipc/discovery_base.h"

#include <boost/asio/io_context.hpp>
#include <boost/asio/steady_timer.hpp>

#include <cstdint>
#include <string>

namespace VlServiced {

/// Answers requests of both IP versions with host and port. An answer goes to the whole group, so one serves
/// all who asked in the meantime, and a flood of requests does not become a flood of answers.
class DiscoveryAnswer {
public:
    /// Listens from now on, as far as the host has IPv6 and IPv4. The io_context is run by one thread.
    DiscoveryAnswer(boost::asio::io_context& io, std::string const& host, std::uint16_t port);

private:
    class Group {
    public:
        Group(boost::asio::io_context& io, bool ipv4, json::Object answer);

    private:
        void onDatagram(json::Object const& datagram);
        void answer();

        Ipc::DiscoveryBase base_;
        boost::asio::steady_timer pause_;
        json::Object answer_;
        bool pausing_ = false;
        bool askedAgain_ = false;
    };

    Group v6_;
    Group v4_;
};

} // namespace VlServiced
