#include "programs/vlserviced/discovery_answer.h"

#include "programs/channel/discovery_proof.h"

#include <algorithm>
#include <chrono>
#include <utility>

namespace VlServiced {
namespace {

/// Between two answers. A client waits for two seconds; and only one send may be under way at a time.
constexpr std::chrono::milliseconds PAUSE{50};
/// As many as are answered in less than a second.
constexpr std::size_t MAX_WAITING = 16;

} // namespace

DiscoveryAnswer::DiscoveryAnswer(boost::asio::io_context& io, std::string const& host, std::uint16_t port,
                                 std::string const& token)
    : service_{host, port, token}, v6_(io, false, service_), v4_(io, true, service_), changes_(io, [this] {
          v6_.listen();
          v4_.listen();
      }) {}

DiscoveryAnswer::Group::Group(boost::asio::io_context& io, bool ipv4, Service const& service)
    : io_(io), ipv4_(ipv4), service_(service), pause_(io) {
    listen();
}

void DiscoveryAnswer::Group::listen() {
    base_.emplace(io_, ipv4_);
    if (base_->isOpen())
        base_->recvAll([this](json::Object const& datagram) { onDatagram(datagram); });
}

void DiscoveryAnswer::Group::onDatagram(json::Object const& datagram) {
    if (!Ipc::DiscoveryBase::isReq(datagram))
        return;
    std::optional<std::string> const nonce = Channel::nonceIn(datagram);
    if (!nonce)
        askedAgain_ = true;
    else if (std::find(nonces_.begin(), nonces_.end(), *nonce) == nonces_.end())
        nonces_.push_back(*nonce);
    if (nonces_.size() > MAX_WAITING)
        nonces_.pop_front();
    if (!pausing_)
        answer();
}

void DiscoveryAnswer::Group::answer() {
    std::optional<std::string> nonce;
    if (!nonces_.empty()) {
        nonce = std::move(nonces_.front());
        nonces_.pop_front();
    }
    askedAgain_ = false;
    pause();
    base_->send(Channel::makeAnswer(service_.host, service_.port, service_.token, nonce));
}

void DiscoveryAnswer::Group::pause() {
    pausing_ = true;
    pause_.expires_after(PAUSE);
    pause_.async_wait([this, alive = std::weak_ptr(alive_)](boost::system::error_code const& ec) {
        if (ec || alive.expired())
            return;
        pausing_ = false;
        if (askedAgain_ || !nonces_.empty())
            answer();
    });
}

} // namespace VlServiced
