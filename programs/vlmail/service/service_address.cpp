#include "programs/vlmail/service/service_address.h"

#include "programs/base/error.h"
#include "programs/base/host_port.h"
#include "vlservice/ipc/discovery_base.h"

#include <utility>

namespace VlMail {

std::string ServiceAddress::text() const { return Base::hostPortText(host, port); }

ServiceAddress parseServiceAddress(std::string const& text) {
    auto address = Base::hostPortIn(text);
    if (!address)
        throw Base::Error(Base::Code::Usage,
                          "\"" + text +
                              "\" names no service: write HOST:PORT, with an IPv6 address in brackets");
    return {std::move(address->host), address->port};
}

std::optional<ServiceAddress> addressInAnswer(json::Object const& answer) {
    std::string host = answer.get(Ipc::DiscoveryBase::SVC_HOST_FLD_NAME).textOrEmpty();
    long long const port = answer.get(Ipc::DiscoveryBase::SVC_PORT_FLD_NAME).intOrZero();
    if (!Base::isHost(host) || port < 1 || port > 65535)
        return std::nullopt;
    return ServiceAddress{std::move(host), static_cast<std::uint16_t>(port)};
}

} // namespace VlMail
