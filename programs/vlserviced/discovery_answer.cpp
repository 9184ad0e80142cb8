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
                                 std::string const& token, Channel::TokenLookup tokens)
    : service_{host, port, token, std::move(tokens)}, v6_(io, false, service_), v4_(io, true, service_),
      changes_(io, [this] {
          v6_.listen();
          v4_.listen();
      }) {}

/// Nobody is told that there is no such token: such a question has no answer with a proof.
json::Object DiscoveryAnswer::Service::answer(json::Object const& question) const {
    std::string const id = Channel::tokenIdIn(question);
    if (id.empty())
        return Channel::makeAnswer(host, port, token, Channel::nonceIn(question));
    std::optional<Channel::TokenKeys> const keys = tokens ? tokens(id) : std::nullopt;
    return keys ? Channel::makeAnswer(host, port, keys->service, Channel::nonceIn(question))
                : Channel::makeAnswer(host, port, token, std::nullopt);
}

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
    auto const isSame = [&](json::Object const& waiting) { return Channel::nonceIn(waiting) == nonce; };
    if (!nonce)
        askedAgain_ = true;
    else if (std::find_if(questions_.begin(), questions_.end(), isSame) == questions_.end())
        questions_.push_back(datagram);
    if (questions_.size() > MAX_WAITING)
        questions_.pop_front();
    if (!pausing_)
        answer();
}

void DiscoveryAnswer::Group::answer() {
    json::Object question;
    if (!questions_.empty()) {
        question = std::move(questions_.front());
        questions_.pop_front();
    }
    askedAgain_ = false;
    pause();
    base_->send(service_.answer(question));
}

void DiscoveryAnswer::Group::pause() {
    pausing_ = true;
    pause_.expires_after(PAUSE);
    pause_.async_wait([this, alive = std::weak_ptr(alive_)](boost::system::error_code const& ec) {
        if (ec || alive.expired())
            return;
        pausing_ = false;
        if (askedAgain_ || !questions_.empty())
            answer();
    });
}

} // namespace VlServiced
