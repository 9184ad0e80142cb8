#include "vlservice/ipc/discovery_cli.h"

#include "vlservice/ipc/gui_fwd.h"

#include <boost/asio/post.hpp>

namespace Ipc {

DiscoveryCli::DiscoveryCli(std::shared_ptr<CmdProcessorI> processor, boost::asio::io_context& io)
    : v6Disc_(io, false), v4Disc_(io, true), cmdProcessor_(std::move(processor)),
      alive_(std::make_shared<char>()) {
    boost::asio::post(io, [this, alive = std::weak_ptr(alive_)] {
        if (alive.expired())
            return;
        ask(v6Disc_);
        ask(v4Disc_);
    });
}

DiscoveryCli::~DiscoveryCli() {
    v6Disc_.close();
    v4Disc_.close();
}

void DiscoveryCli::ask(DiscoveryBase& base) {
    callRcv(base);
    base.send(DiscoveryBase::makeReq());
}

void DiscoveryCli::callRcv(DiscoveryBase& base) {
    base.recv(
        [this, &base](json::Object object) {
            // One's own question comes back, and so do those of other clients.
            if (DiscoveryBase::isReq(object))
                callRcv(base);
            else
                onResp(std::move(object));
        },
        DISCOVERY_TIMEOUT);
}

void DiscoveryCli::onResp(json::Object resp) {
    if (!cmdProcessor_)
        return;
    v4Disc_.close();
    v6Disc_.close();
    auto const processor = std::exchange(cmdProcessor_, nullptr);
    // The processor may destroy this object: nothing of it is touched from here on.
    processor->submit(std::make_shared<GuiFwd>(processor, std::move(resp)));
}

} // namespace Ipc
