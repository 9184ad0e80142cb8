#pragma once
// Which of several services a client talks to.

#include "programs/channel/client.h"
#include "programs/vlmail/service/service_address.h"

#include <functional>
#include <memory>
#include <optional>

namespace VlMail {

/// Leads to one service for as long as that can be had. When it is lost, to the next that knows the token:
/// services that know one token share a database. Used by one thread.
class ServiceRoute {
public:
    using Connect = std::function<std::unique_ptr<Channel::Client>(ServiceAddress const&)>;
    /// Looks on the network for services that prove that they know the token; the first that answers.
    using Search = std::function<std::optional<ServiceAddress>()>;
    using Tell = std::function<void(ServiceAddress const& lost, ServiceAddress const& next)>;

    ServiceRoute(ServiceAddress first, Connect connect, Search search, Tell tell);

    /// Throws what connecting to the first one does: of one that was never reached, nobody knows whether the
    /// others are of its kind.
    std::unique_ptr<Channel::Client> connect();

private:
    std::unique_ptr<Channel::Client> connectToNext();

    ServiceAddress at_;
    Connect connect_;
    Search search_;
    Tell tell_;
    bool wasReached_ = false;
};

} // namespace VlMail
