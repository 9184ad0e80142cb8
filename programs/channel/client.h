#pragma once
// The client's side of the connection, for programs that wait for each answer.

#include "programs/channel/client_settings.h"
#include "vlservice/platform/cmd.h"

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <utility>

namespace Channel {

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

    /// Gives the text of the next data message; nothing when there is no more.
    using DataSource = std::function<std::optional<std::string>()>;

    /// Whether the service takes data on this connection.
    bool takesData() const;
    /// Sends data messages, as many at once as may be under way, and returns when the service has stored all
    /// of them. Throws Error, and what the source throws, which ends the connection.
    void sendData(DataSource const& source);

    /// Whether it can be used further: a failure that leaves it open is one that the service has answered
    /// with.
    bool isOpen() const;

private:
    class Impl;
    std::unique_ptr<Impl> impl_;
};

} // namespace Channel
