#pragma once
// A service on a free port of the loopback address, on a thread of its own, and peers that speak to it byte
// by byte.

#include "programs/channel/client.h"
#include "programs/channel/frame.h"
#include "programs/channel/server.h"
#include "tests/channel/known_texts.h"
#include "tests/ipc/recording_processor.h"
#include "tests/support/free_port.h"
#include "vlservice/ipc/make_empty_cmd.h"
#include "vlservice/ipc/price_est.h"
#include "vlservice/ipc/remove_cfg_node.h"
#include "vlservice/platform/log.h"

#include <chrono>
#include <condition_variable>
#include <functional>
#include <future>
#include <memory>
#include <mutex>
#include <optional>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

namespace ChannelTest {

/// Settings under which a slow machine does not matter.
inline Channel::ServerSettings patient() {
    Channel::ServerSettings settings;
    settings.greetingTime = std::chrono::minutes(1);
    settings.strangersLines = 1'000'000;
    return settings;
}

/// Unless told otherwise it answers as Echo does.
class RunningServer {
public:
    explicit RunningServer(Channel::ServerSettings settings = patient(),
                           Channel::Server::Handler handler = {},
                           Channel::Server::DataHandler dataHandler = {});
    ~RunningServer();
    RunningServer(RunningServer const&) = delete;
    RunningServer& operator=(RunningServer const&) = delete;

    std::uint16_t port() const { return port_; }
    Channel::ClientSettings clientSettings() const;

    /// Does something on the service's thread and gives what it returns.
    template<typename Work>
    auto onThread(Work work) {
        std::packaged_task<decltype(work(std::declval<Channel::Server&>()))()> task(
            [&] { return work(server()); });
        auto result = task.get_future();
        post([&task] { task(); });
        return result.get();
    }
    std::size_t connections();
    /// Waits, within a minute, until so many are connected.
    bool hasConnections(std::size_t wanted);

private:
    struct Running;

    Channel::Server& server();
    void post(std::function<void()> work);

    std::unique_ptr<Running> running_;
    std::uint16_t port_ = 0;
};

/// Collects what is logged as a failure, by all threads, while it lives.
class SharedLog {
public:
    SharedLog();
    ~SharedLog();
    SharedLog(SharedLog const&) = delete;
    SharedLog& operator=(SharedLog const&) = delete;

    std::vector<std::string> lines();
    /// Waits, within a minute, for a line with that in it.
    bool hasLogged(std::string const& part);
    bool hasLoggedYet(std::string const& part);

private:
    bool has(std::string const& part) const;

    std::mutex mutex_;
    std::condition_variable changed_;
    std::vector<std::string> lines_;
    Log::Sink before_;
};

/// Gives an estimate back with the parameters in it, and fails what it does not know.
class Echo : public RecordingProcessor {
public:
    using RecordingProcessor::visit;
    void visit(Ipc::PriceEst& cmd) override { cmd.setResp({{"asked", cmd.reqParams()}}); }
    void visit(Ipc::RemoveCfgNode& cmd) override {
        cmd.setResp("There is no node " + cmd.cfgId().str() + '.');
    }
    void visit(Ipc::UpdateStatus&) override { throw std::runtime_error("The database is away."); }
};

/// A message that owns its text.
struct Message {
    int command;
    Channel::Kind kind;
    std::uint32_t sequence;
    std::string text;
};

/// One end of a connection that may send whatever it likes. It waits a minute at the most for anything.
class RawPeer {
public:
    /// A client.
    explicit RawPeer(std::uint16_t port);
    /// One end of a socket that is connected already.
    class Socket;
    explicit RawPeer(std::unique_ptr<Socket> socket);
    ~RawPeer();
    RawPeer(RawPeer const&) = delete;
    RawPeer& operator=(RawPeer const&) = delete;

    void send(std::string const& bytes);
    void send(int command, Channel::Kind kind, std::uint32_t sequence, std::string const& text);
    /// Says that nothing more will come.
    void finish();
    /// The same with a seal, once there are seals.
    void sendSealed(std::string const& bytes);
    /// The bytes and the seal behind them.
    std::string sealed(std::string const& bytes);
    /// The preface and the exchange of proofs, as a client and as a service.
    void greet(std::uint16_t version = Channel::VERSION_1);
    void welcome(std::uint16_t version = Channel::VERSION, std::string const& text = "{}");
    /// The next message; none when the other side has closed the connection.
    std::optional<Message> receive();
    /// The reason in the error message that comes next, and that the connection is closed behind it.
    std::string refusal();
    bool isClosed();

    /// Closes with a reset instead of an orderly end.
    void vanish();

private:
    void takeSeals(std::string const& own, std::string const& other);

    std::unique_ptr<Socket> socket_;
    Channel::FrameDecoder decoder_;
    std::optional<Channel::Seal> seal_;
};

/// A service that does what the test says with each of the connections that it accepts, on a thread of its
/// own.
class FakeService {
public:
    explicit FakeService(std::function<void(RawPeer&)> script, int connections = 1);
    ~FakeService();
    FakeService(FakeService const&) = delete;
    FakeService& operator=(FakeService const&) = delete;

    Channel::ClientSettings clientSettings() const;
    /// What its messages begin with.
    std::string name() const;

private:
    struct Running;

    std::unique_ptr<Running> running_;
    std::uint16_t port_;
};

using VLServiceTest::freePort;

constexpr int PRICE = Ipc::PriceEst::CMD_ID;

/// The bytes of a message.
std::string bytesOf(int command, Channel::Kind kind, std::uint32_t sequence, std::string const& text);

} // namespace ChannelTest
