#pragma once
// The handlers of discovery, called as the sockets and timers would call them.

#include "vlservice/ipc/discovery_base.h"
#include "vlservice/ipc/discovery_cli.h"

#include <algorithm>
#include <string_view>

namespace Ipc {

struct DiscoveryTestAccess {
    /// A datagram arrives; what does not fit into the buffer is cut off.
    static void receive(DiscoveryBase& base, std::string_view datagram) {
        std::size_t const length = std::min<std::size_t>(datagram.size(), DiscoveryBase::MAX_RCV_LENGTH);
        std::copy_n(datagram.begin(), length, base.rcvBuf_.begin());
        base.handleReceive({}, length);
    }
    static void failReceive(DiscoveryBase& base, boost::system::error_code ec) { base.handleReceive(ec, 0); }
    static void finishSend(DiscoveryBase& base, boost::system::error_code ec) { base.handleSend(ec); }
    static void finishWait(DiscoveryBase& base, boost::system::error_code ec) { base.handleTimeout(ec); }

    static DiscoveryBase& v6(DiscoveryCli& cli) { return cli.v6Disc_; }
    static DiscoveryBase& v4(DiscoveryCli& cli) { return cli.v4Disc_; }
    /// Counts how often a timed receive was started.
    static std::uint64_t timersStarted(DiscoveryBase const& base) { return base.timerGeneration_; }
};

} // namespace Ipc
