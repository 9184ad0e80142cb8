#pragma once
// Answers clients that look for the service.

#include "programs/channel/greeting.h"
#include "programs/vlserviced/network_changes.h"
#include "vlservice/ipc/discovery_base.h"

#include <boost/asio/io_context.hpp>
#include <boost/asio/steady_timer.hpp>

#include <cstdint>
#include <deque>
#include <memory>
#include <optional>
#include <string>

namespace VlServiced {

/// Answers requests of both IP versions with host and port, and with a proof of the token that the request
/// names, or of the service's own, where it has a nonce. Answers go to the whole group, one without a proof
/// serves all who asked in the meantime, and a flood of requests does not become a flood of answers.
class DiscoveryAnswer {
public:
    /// Listens from now on, as far as the host has IPv6 and IPv4, and anew whenever the network has changed.
    /// The io_context is run by one thread.
    DiscoveryAnswer(boost::asio::io_context& io, std::string const& host, std::uint16_t port,
                    std::string const& token, Channel::TokenLookup tokens = {});

private:
    struct Service {
        std::string host;
        std::uint16_t port;
        std::string token;
        Channel::TokenLookup tokens;

        json::Object answer(json::Object const& question) const;
    };

    class Group {
    public:
        Group(boost::asio::io_context& io, bool ipv4, Service const& service);

        /// Joins on the interfaces as they are now.
        void listen();

    private:
        void onDatagram(json::Object const& datagram);
        void answer();
        void pause();

        boost::asio::io_context& io_;
        bool ipv4_;
        Service const& service_;
        std::optional<Ipc::DiscoveryBase> base_;
        boost::asio::steady_timer pause_;
        bool pausing_ = false;
        bool askedAgain_ = false;
        /// Those with a nonce that wait for an answer; the oldest first.
        std::deque<json::Object> questions_;
        /// Expires first of all; the timer's handler watches it.
        std::shared_ptr<void> alive_ = std::make_shared<char>();
    };

    Service service_;
    Group v6_;
    Group v4_;
    NetworkChanges changes_;
};

} // namespace VlServiced
