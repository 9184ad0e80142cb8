#include "programs/vlmail/service/service_route.h"

#include "programs/base/error.h"

#include <utility>

namespace VlMail {

ServiceRoute::ServiceRoute(ServiceAddress first, Connect connect, Search search, Tell tell)
    : at_(std::move(first)), connect_(std::move(connect)), search_(std::move(search)),
      tell_(std::move(tell)) {}

std::unique_ptr<Channel::Client> ServiceRoute::connect() {
    try {
        std::unique_ptr<Channel::Client> client = connect_(at_);
        wasReached_ = true;
        return client;
    } catch (Base::Error const&) {
        std::unique_ptr<Channel::Client> next = wasReached_ ? connectToNext() : nullptr;
        if (!next)
            throw;
        return next;
    }
}

/// None where there is no other: what is wrong with the first is what a person wants to know.
std::unique_ptr<Channel::Client> ServiceRoute::connectToNext() {
    std::optional<ServiceAddress> const next = search_();
    if (!next || next->text() == at_.text())
        return nullptr;
    std::unique_ptr<Channel::Client> client = connect_(*next);
    tell_(std::exchange(at_, *next), *next);
    return client;
}

} // namespace VlMail
