#include "programs/channel/host_lookup.h"

#include "programs/base/error.h"

#include <netdb.h>
#include <sys/socket.h>

#include <array>
#include <memory>

namespace Channel {
namespace {

std::string addressText(addrinfo const& found) {
    std::array<char, NI_MAXHOST> text{};
    int const failure =
        ::getnameinfo(found.ai_addr, found.ai_addrlen, text.data(), text.size(), nullptr, 0, NI_NUMERICHOST);
    return failure == 0 ? text.data() : "";
}

} // namespace

std::vector<std::string> lookUpHost(std::string const& host) {
    addrinfo wanted{};
    wanted.ai_socktype = SOCK_STREAM;
    wanted.ai_flags = AI_ADDRCONFIG;
    addrinfo* first = nullptr;
    if (int const failure = ::getaddrinfo(host.c_str(), nullptr, &wanted, &first); failure != 0)
        throw Base::Error(Base::Code::ServiceUnreachable,
                          std::string("The host cannot be found: ") + ::gai_strerror(failure) + '.');
    std::unique_ptr<addrinfo, decltype(&::freeaddrinfo)> const list(first, ::freeaddrinfo);
    std::vector<std::string> addresses;
    for (addrinfo const* found = list.get(); found; found = found->ai_next)
        if (std::string address = addressText(*found); !address.empty())
            addresses.push_back(std::move(address));
    return addresses;
}

} // namespace Channel
