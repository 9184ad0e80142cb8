#include "programs/vlserviced/discovery_answer.h"

#include <chrono>
#include <utility>

namespace VlServiced {
namespace {

/// Between two answers. A client waits for two seconds; and only one send may be under way at a time.
constexpr std::chrono::milliseconds PAUSE{50};

json::Object answerOf(std::string const& host, std::uint16_t port) {
    return {{Ipc::DiscoveryBase::SVC_HOST_FLD_NAME.c_str(), host},
            {Ipc::DiscoveryBase::SVC_PORT_FLD_NAME.c_str(), port}};
}

} // namespace

DiscoveryAnswer::DiscoveryAnswer(boost::asio::io_context& io, std::string const& host, std::uint16_t port)
    : v6_(io, false, answerOf(host, port)), v4_(io, true, answerOf(host, port)) {}

DiscoveryAnswer::Group::Group(boost::asio::io_context& io, bool ipv4, json::Object answer)
    : base_(io, ipv4), pause_(io), answer_(std::move(answer)) {
    if (base_.isOpen())
        base_.recvAll([this](json::Object const& datagram) { onDatagram(datagram); });
}

void DiscoveryAnswer::Group::onDatagram(json::Object const& datagram) {
    if (!Ipc::DiscoveryBase::isReq(datagram))
        return;
    if (pausing_)
        askedAgain_ = true;
    else
        answer();
}

void DiscoveryAnswer::Group::answer() {
    base_.send(answer_);
    pausing_ = true;
    pause_.expires_after(PAUSE);
    pause_.async_wait([this](boost::system::error_code const& ec) {
        if (ec)
            return;
        pausing_ = false;
        if (std::exchange(askedAgain_, false))
            answer();
    });
}

} // namespace VlServiced
