#pragma once
// One client as its service sees it: the greeting, then a request and its answer, one after the other.

#include "programs/channel/deadline.h"
#include "programs/channel/greeting.h"
#include "programs/channel/link.h"
#include "programs/channel/server.h"

#include <cstdint>
#include <deque>
#include <functional>
#include <memory>
#include <optional>
#include <string>

namespace Channel {

class Peer;

/// What all peers of a service share.
class PeerContext {
public:
    virtual ~PeerContext() = default;

    virtual ServerSettings const& settings() const = 0;
    virtual std::string const& fingerprint() const = 0;
    /// Null without TLS.
    virtual boost::asio::ssl::context* tls() = 0;
    virtual Server::Factory const& factory() const = 0;
    virtual Server::Handler const& handler() const = 0;
    /// Empty where no data is taken.
    virtual Server::DataHandler const& dataHandler() const = 0;
    virtual bool isStopping() const = 0;

    /// Takes memory for a large request or for data and calls the peer's onReserved, now or as soon as there
    /// is some.
    virtual void reserve(std::size_t size, std::shared_ptr<Peer> peer) = 0;
    virtual void release(std::size_t size) = 0;
    /// Counts an answer that is on its way, of a size or of none any more.
    virtual void holdAnswer(std::shared_ptr<Peer> const& peer, std::size_t size) = 0;
    /// Counts a line about somebody who has not proved himself; false when it is one too many.
    virtual bool mayTellOfStranger() = 0;
    /// The peer has proved itself.
    virtual void know(std::shared_ptr<Peer> const& peer) = 0;
    virtual void leave(std::shared_ptr<Peer> const& peer) = 0;
};

/// The processor and the carrier of the commands that it receives. It must be closed: what it handles holds
/// it.
class Peer : public Ipc::CmdProcessorI, public Ipc::CmdTransferI, public std::enable_shared_from_this<Peer> {
public:
    static std::shared_ptr<Peer> make(boost::asio::io_context& io, std::shared_ptr<PeerContext> context,
                                      tcp::socket socket);

    void start();
    /// A large request, or data, may go on.
    void onReserved(std::size_t size);
    /// Closes at once, or when the command that is being handled has been answered.
    void stop();
    void close();
    /// Closes for the sake of others before it has proved itself.
    void makeWay();
    /// Closes, with a line in the log.
    void giveUp(std::string const& reason);
    std::string const& tokenId() const { return tokenId_; }
    /// Whether a line of the log tells of a failure.
    enum class Telling { Log, Nobody };
    /// The handling has ended, with the reason when it failed.
    void answered(std::optional<std::string> const& failure, Telling telling = Telling::Log);
    /// What became of data that counts that many bytes. Failures of another round than the one at hand are
    /// those of pieces that nobody waits for any more.
    void dataStored(std::uint32_t sequence, std::size_t size, std::uint32_t round,
                    std::optional<std::string> const& failure);

    // A service sends no requests of its own.
    void submit(std::shared_ptr<Ipc::CmdI> cmd) override;
    Ipc::CmdTransferI* transfer() override { return this; }
    void send(std::shared_ptr<Ipc::CmdI> cmd, Message which, json::Object const& message,
              std::function<void()> gone) override;
    void read(std::shared_ptr<Ipc::CmdI> cmd, Message which,
              std::function<void(json::Object const&)> taken) override;

private:
    enum class State { Greeting, Ready, Leaving, Closed };

    /// The request that is being handled.
    struct Request {
        Frame message;
        std::shared_ptr<Ipc::CmdI> cmd;
        bool isRead = false;
        bool isAnswered = false;
    };

    /// A data message that waits for memory.
    struct Data {
        std::uint32_t sequence = 0;
        std::string text;
    };

    /// A message that waits until the one in front of it is written.
    struct Outgoing {
        std::uint8_t command;
        Kind kind;
        std::uint32_t sequence;
        std::string text;
        std::function<void()> gone;
    };

    Peer(boost::asio::io_context& io, std::shared_ptr<PeerContext> context, tcp::socket socket);

    void expectTls();
    void onFirstByte(error_code const& ec);
    void shakeHands();
    void receive();
    void onReceived(Received const& received);
    void onPart();
    void onLarge();
    void onMessage(Frame const& message);
    void onGreeting(Frame const& message);
    void onWelcome(std::optional<SealKeys> const& seals);
    Terms terms() const;
    void onRequest(Frame const& message);
    void takeRequest(std::uint8_t command);

    void onData(Frame const& message);
    void takeData();
    void handOver(std::string text, DataStored const& stored);
    void tellStored(std::uint32_t sequence);

    void write(Frame const& message, std::function<void()> gone);
    void writeNow(Frame const& message, std::function<void()> gone);
    void writeWaiting();
    /// Runs a step; what it throws is the end of the connection.
    template<typename Step>
    void orGiveUp(Step step);
    void setDeadline(std::chrono::milliseconds time, std::string reason);
    void refuseRequest(std::string const& reason, Telling telling = Telling::Log);
    void tellGone(std::function<void()> const& gone) const;
    void endRequest();
    /// Tells the peer and the log what is wrong with it, and closes.
    void refuse(std::string const& reason);
    void onDue();
    void log(int priority, std::string const& text) const;

    std::shared_ptr<PeerContext> context_;
    boost::asio::io_context& io_;
    std::string name_;
    /// Until it is known what is spoken on it.
    std::optional<tcp::socket> socket_;
    std::shared_ptr<Link> link_;
    std::optional<Deadline> deadline_;
    State state_ = State::Greeting;
    /// Whether the client has proved itself.
    bool isKnown_ = false;
    /// What becomes of the connection when the deadline is due.
    std::string dueReason_;
    bool isInsideMessage_ = false;
    std::optional<ServiceGreeting> greeting_;
    std::string tokenId_;
    Ends ends_;
    std::optional<Request> request_;
    std::size_t reserved_ = 0;
    std::optional<Data> data_;
    /// Of data that is not stored yet.
    std::size_t unstored_ = 0;
    /// Grows with each request: what the data in front of it came to is over then.
    std::uint32_t round_ = 0;
    /// Whether data is passed over, since some of it was refused.
    bool passesDataOver_ = false;
    std::optional<Deadline> writeDeadline_;
    bool isWriting_ = false;
    std::deque<Outgoing> outgoing_;
};

} // namespace Channel
