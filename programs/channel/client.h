#pragma once
// The client's side of the connection, for programs that wait for each answer.

#include "programs/base/error.h"
#include "programs/channel/tls.h"
#include "vlservice/platform/cmd.h"

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <utility>

namespace Channel {

struct ClientSettings {
    std::string host;
    std::uint16_t port = 0;
    std::string token;
    Tls tls = Tls::Auto;
    /// The file of accepted certificates.
    std::string pinFile;
    /// Shows a certificate that is new to the person and tells whether to go on; it is then accepted for
    /// good. Without this function new certificates are refused.
    std::function<bool(std::string const& service, std::string const& fingerprint)> acceptNew;

    /// For finding the host, connecting and the exchange of proofs together.
    std::chrono::milliseconds connectTime = std::chrono::seconds(10);
    /// How long a request of that class may take; zero is no limit.
    std::function<std::chrono::milliseconds(Ipc::Timeouts::TimeoutId)> requestTime = &Ipc::Timeouts::duration;
};

/// One connection, used by one thread. After a failure it is of no more use; make another.
class Client {
public:
    /// Connects; both sides have then proved that they know the token. Throws Error.
    explicit Client(ClientSettings settings);
    ~Client();
    Client(Client const&) = delete;
    Client& operator=(Client const&) = delete;

    /// Which the commands for this connection are built with.
    std::shared_ptr<Ipc::CmdProcessorI> processor() const;
    /// Sends a command and returns when its response has been read. Throws Error, with what the command's
    /// onTransferError has been told before, no later than the request's time.
    void send(std::shared_ptr<Ipc::CmdI> const& cmd);
    /// Builds a command from what follows its processor, sends it and returns it.
    template<typename Cmd, typename... Args>
    std::shared_ptr<Cmd> call(Args&&... args) {
        auto const cmd = std::make_shared<Cmd>(processor(), std::forward<Args>(args)...);
        send(cmd);
        return cmd;
    }

private:
    class Impl;
    std::unique_ptr<Impl> impl_;
};

} // namespace Channel
