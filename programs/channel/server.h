#pragma once
// The service's side of the connection: it listens, lets in who knows the access token, and hands over
// commands.

#include "programs/channel/server_settings.h"
#include "vlservice/platform/cmd.h"

#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>

namespace boost::asio {
class io_context;
}

namespace Channel {

/// Ends the handling of one command; copies are the same answer. May be called from any thread, once: further
/// calls do nothing. An answer that goes without a call is a failure. The command is not touched by the
/// caller afterwards.
class Answer {
public:
    class State;
    explicit Answer(std::shared_ptr<State> state) : state_(std::move(state)) {}

    /// The command's response goes out.
    void operator()() const;
    /// An error message goes out instead; the client's command is told it as a transfer error.
    void fail(std::string const& reason) const;
    /// The same without a line in the log, which whoever refuses it sees to.
    void refuse(std::string const& reason) const;

private:
    std::shared_ptr<State> state_;
};

/// Tells the client that a piece of a page is stored; copies are the same word. May be called from any
/// thread, once. Until then the piece counts towards the memory that all may have. A word that goes without a
/// call is a failure.
class DataStored {
public:
    class State;
    explicit DataStored(std::shared_ptr<State> state) : state_(std::move(state)) {}

    void operator()() const;
    /// What the client sends of data is passed over from here to its next request.
    void fail(std::string const& reason) const;

private:
    std::shared_ptr<State> state_;
};

/// A piece of a page as it came.
struct ReceivedData {
    /// The connection, as the commands that come on it have it for their processor.
    std::shared_ptr<Ipc::CmdProcessorI> connection;
    /// Which parseData() takes.
    std::string text;
};

/// Everything happens on the thread that runs the io_context. A connection's next request is read when the
/// one before has been answered, so that a connection is answered in order and costs one request's memory.
class Server {
public:
    /// An empty command for a number, which holds that processor; null when there is none. Ipc::makeEmptyCmd
    /// is one.
    using Factory = std::function<std::shared_ptr<Ipc::CmdI>(unsigned char id,
                                                             std::shared_ptr<Ipc::CmdProcessorI> connection)>;
    /// Carries out a command whose request has been read. What it throws is answered as a failure.
    using Handler = std::function<void(std::shared_ptr<Ipc::CmdI> cmd, Answer answer)>;

    /// Takes a piece of a page, several of a connection at once. What it throws is answered as a failure.
    using DataHandler = std::function<void(ReceivedData data, DataStored stored)>;

    /// Listens from now on. Raises the limit of open files as far as the system lets it. Without a function
    /// for data none is taken. Throws Error.
    Server(boost::asio::io_context& io, ServerSettings settings, Factory factory, Handler handler,
           DataHandler dataHandler = {});
    /// Closes all connections at once.
    ~Server();
    Server(Server const&) = delete;
    Server& operator=(Server const&) = delete;

    std::uint16_t port() const;
    /// Of the certificate; empty without TLS.
    std::string const& fingerprint() const;
    /// When the certificate ends, in seconds since the epoch; nothing without TLS.
    std::optional<long long> certificateEnds() const;
    std::size_t connections() const;

    /// Lets nobody in any more and closes each connection when the command that it is handling has been
    /// answered. When all are closed, nothing of the server is left in the io_context.
    void stop();

private:
    class Impl;
    std::shared_ptr<Impl> impl_;
};

/// The id of the token by which a connection was let in, given as the processor of its commands; empty for
/// the service's own, and for what is no connection.
std::string tokenIdOf(Ipc::CmdProcessorI const& connection);

/// The handler for processors that are done when accept returns. The processor is what the commands expect.
Server::Handler acceptAtOnce(std::shared_ptr<Ipc::CmdProcessorI> processor);

} // namespace Channel
