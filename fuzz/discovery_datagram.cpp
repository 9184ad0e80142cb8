// A datagram from anybody on the network: it is dropped, or reaches the receiver as an object.

#include "tests/ipc/discovery_access.h"
#include "tests/ipc/failing_syscalls.h"
#include "tests/ipc/json_steps.h"

#include "vlservice/platform/log.h"

#include <cstdint>
#include <cstdlib>
#include <optional>

namespace {

/// Its socket cannot open, so nothing leaves this program.
class Receiver {
public:
    Receiver() {
        Log::setSink({});
        whileRefused({SYS_socket}, EAFNOSUPPORT, [this] { base_.emplace(io_, true); });
        base_->recv([](json::Object object) {
            Ipc::DiscoveryBase::isReq(object);
            if (parse(text(object)) != object)
                std::abort();
        });
    }
    void receive(std::string_view datagram) { Ipc::DiscoveryTestAccess::receive(*base_, datagram); }

private:
    boost::asio::io_context io_;
    boost::asio::deadline_timer reactorMaker_{io_};
    std::optional<Ipc::DiscoveryBase> base_;
};

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    static Receiver receiver;
    receiver.receive({reinterpret_cast<char const*>(data), size});
    return 0;
}
