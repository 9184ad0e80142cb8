#pragma once
// Finds the service on the local network without any configuration.

#include "vlservice/export.h"
#include "vlservice/ipc/discovery_base.h"
#include "vlservice/platform/cmd.h"

#include <memory>

namespace Ipc {

/// Asks over IPv6 and IPv4 at once and hands its processor exactly one GuiFwd: with the first answer, or with
/// an empty object after two seconds without any. The processor may destroy this object while it takes the
/// command. The answer is whatever somebody on the network sent; nothing in it has been tested.
class VLSERVICE_EXPORT DiscoveryCli {
public:
    /// How long an answer is waited for.
    inline static boost::posix_time::time_duration const DISCOVERY_TIMEOUT = boost::posix_time::seconds(2);

    /// The search begins when the io_context, which is run by a single thread, runs next.
    DiscoveryCli(std::shared_ptr<CmdProcessorI> processor, boost::asio::io_context& io);
    /// Ends the search; a command that was not handed over by then never is.
    ~DiscoveryCli();
    DiscoveryCli(DiscoveryCli const&) = delete;
    DiscoveryCli& operator=(DiscoveryCli const&) = delete;

private:
    friend struct DiscoveryTestAccess;

    void ask(DiscoveryBase& base);
    void callRcv(DiscoveryBase& base);
    void onResp(json::Object resp);

    DiscoveryBase v6Disc_;
    DiscoveryBase v4Disc_;
    std::shared_ptr<CmdProcessorI> cmdProcessor_;
    /// Expires first of all; the posted start watches it.
    std::shared_ptr<void> alive_;
};

} // namespace Ipc
