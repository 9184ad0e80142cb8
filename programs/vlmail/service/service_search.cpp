#include "programs/vlmail/service/service_search.h"

#include "programs/channel/discovery_proof.h"
#include "programs/channel/token.h"
#include "vlservice/ipc/discovery_base.h"

#include <boost/asio/io_context.hpp>

namespace VlMail {
namespace {

/// Both IP versions at once.
class Search {
public:
    Search(std::string const& token, bool wantsProof) : token_(token), wantsProof_(wantsProof) {
        for (Ipc::DiscoveryBase* const base : {&v6_, &v4_})
            if (base->isOpen())
                ask(*base);
    }

    std::optional<ServiceAddress> run(std::chrono::milliseconds time) {
        io_.run_for(time);
        return found_;
    }

private:
    void ask(Ipc::DiscoveryBase& base) {
        base.recvAll([this](json::Object const& datagram) { onDatagram(datagram); });
        base.send(Channel::signedQuestion(nonce_, token_));
    }

    void onDatagram(json::Object const& datagram) {
        if (Ipc::DiscoveryBase::isReq(datagram))
            return;
        std::optional<ServiceAddress> const address = addressInAnswer(datagram);
        if (!address)
            return;
        bool const isProven = !token_.empty() && Channel::isProven(datagram, token_, nonce_);
        if (isProven || (!found_ && !wantsProof_))
            found_ = address;
        if (isProven || token_.empty())
            io_.stop();
    }

    std::string const& token_;
    bool wantsProof_;
    std::string const nonce_ = Channel::makeNonce();
    boost::asio::io_context io_{1};
    Ipc::DiscoveryBase v6_{io_, false};
    Ipc::DiscoveryBase v4_{io_, true};
    std::optional<ServiceAddress> found_;
};

} // namespace

std::optional<ServiceAddress> searchNetwork(std::string const& token, std::chrono::milliseconds time) {
    return Search(token, false).run(time);
}

std::optional<ServiceAddress> searchProven(std::string const& token, std::chrono::milliseconds time) {
    return Search(token, true).run(time);
}

} // namespace VlMail
