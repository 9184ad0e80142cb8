#pragma once
// The client's side of the connection, for programs that run an io_context: the queue of its requests.

#include "programs/channel/background_lookup.h"
#include "programs/channel/client.h"
#include "programs/channel/deadline.h"
#include "programs/channel/greeting.h"
#include "programs/channel/link.h"

#include <cstddef>
#include <cstdint>
#include <deque>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <utility>

namespace Channel {

/// Data that a client is sending.
struct DataUnderWay {
    /// Numbers and sizes of the messages that are not stored yet.
    std::deque<std::pair<std::uint32_t, std::size_t>> messages = {};
    std::size_t bytes = 0;
    bool isWriting = false;
    bool isReceiving = false;
    bool isAtEnd = false;
    std::string refusal = {};
};

/// The processor and the carrier of its commands. Everything happens on the thread that runs the io_context.
/// Requests go out in the order of their submission, each when the one before has been answered. Each has its
/// time, from its submission on; one that gets no answer in time, and any other failure of the connection,
/// ends all of them and the connection. It must be closed in the end, before the io_context goes; commands
/// may outlive both.
class ClientConnection : public Ipc::CmdProcessorI,
                         public Ipc::CmdTransferI,
                         public std::enable_shared_from_this<ClientConnection> {
public:
    /// Called once, with the reason of the failure, which is empty on success. It may close the connection.
    using Done = std::function<void(std::string const& failure)>;

    static std::shared_ptr<ClientConnection> make(boost::asio::io_context& io, ClientSettings settings);

    /// Commands may be submitted before it is done.
    void connect(Done done);
    void submit(std::shared_ptr<Ipc::CmdI> cmd) override { submit(std::move(cmd), {}); }
    /// A failure is told to the command's onTransferError first.
    void submit(std::shared_ptr<Ipc::CmdI> cmd, Done done);
    /// Sends data when its turn comes, in the queue of the commands. It has its time from each word of the
    /// service's to the next.
    void submitData(Client::DataSource source, Done done);
    /// Whether the service takes data; known when connected.
    bool takesData() const { return takesData_; }
    /// Goes on after a command that did not want the next request to be sent.
    void sendNext();
    /// What is waiting fails.
    void close();
    /// Whether requests can still be answered on it.
    bool isOpen() const { return state_ != State::Closed; }

    Ipc::CmdTransferI* transfer() override { return this; }
    void send(std::shared_ptr<Ipc::CmdI> cmd, Message which, json::Object const& message,
              std::function<void()> gone) override;
    void read(std::shared_ptr<Ipc::CmdI> cmd, Message which,
              std::function<void(json::Object const&)> taken) override;

private:
    enum class State { New, Connecting, Ready, Closed };

    /// A command, or data.
    struct Request {
        std::shared_ptr<Ipc::CmdI> cmd;
        Done done;
        std::chrono::milliseconds time;
        Deadline::Clock::time_point due;
        Client::DataSource source = {};
    };

    ClientConnection(boost::asio::io_context& io, ClientSettings settings);

    // Connecting, in this order.
    void resolve();
    void onLookedUp(std::string const& failure, std::vector<std::string> const& addresses);
    void connectTo(std::vector<tcp::endpoint> endpoints);
    void onConnected(tcp::socket socket);
    void onHandshake();
    void greet();
    Terms terms() const;
    void onGreeting(Frame const& message);
    void onOldService(Frame const& message);
    void onWelcome(std::optional<SealKeys> const& seals);
    void requirePinned() const;
    void pinNew();

    // The queue.
    void pump();
    void begin();
    void takeAnswer(Frame const& message);
    void endRequest(std::string const& failure);
    void onDue();

    // Data.
    void beginData();
    void pumpData();
    void sendPiece(std::string const& text);
    void awaitStored();
    void onStored(Frame const& message);

    void write(Frame const& message, std::function<void()> gone);
    /// Hands on the next message; whatever else happens is the end.
    void receive(std::function<void(Frame const&)> onMessage);
    /// Runs a step; what it throws is the end.
    template<typename Step>
    void orFail(Step step);
    void fail(std::string const& reason);
    void end(std::string const& reason);
    void failRequest(Request& request, std::string const& reason);
    std::string service() const;

    boost::asio::io_context* io_;
    ClientSettings settings_;
    State state_ = State::New;
    std::string failure_;
    Done connected_;
    std::unique_ptr<boost::asio::ssl::context> tls_;
    std::optional<BackgroundLookup> lookup_;
    std::optional<tcp::socket> socket_;
    std::shared_ptr<Link> link_;
    std::optional<Deadline> connectDeadline_;
    std::optional<Deadline> deadline_;
    std::uint16_t version_ = VERSION;
    Ends ends_;
    std::optional<ClientGreeting> greeting_;
    std::string fingerprint_;

    /// The first is under way while isBusy_.
    std::deque<Request> requests_;
    bool isBusy_ = false;
    bool isSent_ = false;
    bool isHeld_ = false;
    std::uint32_t sequence_ = 0;
    std::function<void(json::Object const&)> taken_;
    bool takesData_ = false;
    std::optional<DataUnderWay> upload_;
};

} // namespace Channel
