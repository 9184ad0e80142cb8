#include "tests/channel/running_server.h"

#include "programs/channel/greeting.h"
#include "programs/channel/message_text.h"
#include "programs/channel/proof.h"
#include "programs/channel/stream.h"
#include "programs/channel/token.h"

#include "vlservice/ipc/make_empty_cmd.h"

#include <boost/asio/buffer.hpp>
#include <boost/asio/executor_work_guard.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/read.hpp>
#include <boost/asio/write.hpp>

#include <sys/socket.h>

#include <algorithm>
#include <chrono>
#include <thread>

namespace ChannelTest {

namespace asio = boost::asio;
using namespace std::chrono_literals;

namespace {

/// Only what fails takes so long.
constexpr auto PATIENCE = 60s;

} // namespace

// --- RunningServer

struct RunningServer::Running {
    asio::io_context io;
    std::unique_ptr<Channel::Server> server;
    std::thread thread;
};

RunningServer::RunningServer(Channel::ServerSettings settings, Channel::Server::Handler handler,
                             Channel::Server::DataHandler dataHandler)
    : running_(std::make_unique<Running>()) {
    if (settings.token.empty())
        settings.token = TOKEN;
    if (!handler)
        handler = Channel::acceptAtOnce(std::make_shared<Echo>());
    running_->server = std::make_unique<Channel::Server>(running_->io, std::move(settings), Ipc::makeEmptyCmd,
                                                         std::move(handler), std::move(dataHandler));
    port_ = running_->server->port();
    running_->thread = std::thread([this] {
        auto const work = asio::make_work_guard(running_->io);
        running_->io.run();
    });
}

RunningServer::~RunningServer() {
    running_->io.stop();
    running_->thread.join();
    running_->server.reset();
}

Channel::Server& RunningServer::server() { return *running_->server; }

Channel::ClientSettings RunningServer::clientSettings() const {
    Channel::ClientSettings settings;
    settings.host = "127.0.0.1";
    settings.port = port_;
    settings.token = TOKEN;
    settings.connectTime = PATIENCE;
    return settings;
}

void RunningServer::post(std::function<void()> work) { asio::post(running_->io, std::move(work)); }

std::size_t RunningServer::connections() {
    return onThread([](Channel::Server& server) { return server.connections(); });
}

bool RunningServer::hasConnections(std::size_t wanted) {
    auto const deadline = std::chrono::steady_clock::now() + PATIENCE;
    while (connections() != wanted)
        if (std::chrono::steady_clock::now() > deadline)
            return false;
    return true;
}

// --- SharedLog

SharedLog::SharedLog()
    : before_(Log::setSink([this](LogPriority priority, std::string const& line) {
          if (priority >= 7)
              return;
          std::lock_guard const guard(mutex_);
          lines_.push_back(line);
          changed_.notify_all();
      })) {}

SharedLog::~SharedLog() { Log::setSink(before_); }

std::vector<std::string> SharedLog::lines() {
    std::lock_guard const guard(mutex_);
    return lines_;
}

bool SharedLog::hasLogged(std::string const& part) {
    std::unique_lock lock(mutex_);
    return changed_.wait_for(lock, PATIENCE, [&] { return has(part); });
}

bool SharedLog::hasLoggedYet(std::string const& part) {
    std::lock_guard const guard(mutex_);
    return has(part);
}

bool SharedLog::has(std::string const& part) const {
    return std::any_of(lines_.begin(), lines_.end(),
                       [&](std::string const& line) { return line.find(part) != std::string::npos; });
}

// --- RawPeer

std::string bytesOf(int command, Channel::Kind kind, std::uint32_t sequence, std::string const& text) {
    std::string bytes;
    Channel::appendFrame(bytes, {static_cast<std::uint8_t>(command), kind, sequence, text});
    return bytes;
}

class RawPeer::Socket {
public:
    Socket() : socket(io) {}

    void setPatience() {
        timeval const patience{std::chrono::seconds(PATIENCE).count(), 0};
        ::setsockopt(socket.native_handle(), SOL_SOCKET, SO_RCVTIMEO, &patience, sizeof patience);
    }

    asio::io_context io;
    asio::ip::tcp::socket socket;
};

RawPeer::RawPeer(std::uint16_t port) : socket_(std::make_unique<Socket>()) {
    socket_->socket.connect({asio::ip::address_v4::loopback(), port});
    socket_->setPatience();
}

RawPeer::RawPeer(std::unique_ptr<Socket> socket) : socket_(std::move(socket)) { socket_->setPatience(); }

RawPeer::~RawPeer() = default;

void RawPeer::send(std::string const& bytes) { asio::write(socket_->socket, asio::buffer(bytes)); }

std::string RawPeer::sealed(std::string const& bytes) { return bytes + seal_.value().next(bytes); }

void RawPeer::sendSealed(std::string const& bytes) { send(seal_ ? sealed(bytes) : bytes); }

void RawPeer::send(int command, Channel::Kind kind, std::uint32_t sequence, std::string const& text) {
    sendSealed(bytesOf(command, kind, sequence, text));
}

void RawPeer::takeSeals(std::string const& own, std::string const& other) {
    seal_.emplace(own);
    decoder_.expectSeals(other);
}

void RawPeer::finish() { socket_->socket.shutdown(asio::ip::tcp::socket::shutdown_send); }

void RawPeer::welcome(std::uint16_t version, std::string const& text) {
    auto const ends = Channel::endsOf(socket_->socket);
    Channel::Terms const terms{version, TOKEN, "", ends.other, ends.own};
    std::string const nonce = Channel::makeNonce();
    auto const challenge = receive();
    std::string const clientNonce = Channel::parse(challenge.value().text).get(Channel::NONCE).toString();
    std::string const proof = Channel::makeProof(Channel::Side::Service, terms, clientNonce, nonce);
    send(Channel::preface(version));
    send(Channel::GREETING, Channel::Kind::Response, Channel::CHALLENGE,
         Channel::print({{Channel::NONCE, nonce}, {Channel::PROOF, proof}}));
    receive().value();
    send(Channel::GREETING, Channel::Kind::Response, Channel::PROVING, text);
    if (version > Channel::VERSION_1)
        takeSeals(makeSealKey(Channel::Side::Service, terms, clientNonce, nonce),
                  makeSealKey(Channel::Side::Client, terms, clientNonce, nonce));
}

std::optional<Message> RawPeer::receive() {
    for (;;) {
        if (auto const frame = decoder_.next())
            return Message{frame->command, frame->kind, frame->sequence, std::string(frame->text)};
        auto const room = decoder_.room();
        // Straight from the system: the library's reading would wait for longer than the socket's patience.
        ssize_t const got = ::recv(socket_->socket.native_handle(), room.data(), room.size(), 0);
        if (got < 0 && errno != ECONNRESET)
            throw std::runtime_error("The service says nothing.");
        if (got <= 0)
            return std::nullopt;
        decoder_.commit(static_cast<std::size_t>(got));
    }
}

void RawPeer::greet(std::uint16_t version) {
    auto const ends = Channel::endsOf(socket_->socket);
    Channel::Terms const terms{version, TOKEN, "", ends.own, ends.other};
    std::string const nonce = Channel::makeNonce();
    send(Channel::preface(version));
    send(Channel::GREETING, Channel::Kind::Request, Channel::CHALLENGE,
         Channel::print({{Channel::NONCE, nonce}}));
    auto const challenge = receive();
    std::string const serviceNonce = Channel::parse(challenge.value().text).get(Channel::NONCE).toString();
    std::string const proof = Channel::makeProof(Channel::Side::Client, terms, nonce, serviceNonce);
    send(Channel::GREETING, Channel::Kind::Request, Channel::PROVING,
         Channel::print({{Channel::PROOF, proof}}));
    if (receive().value().kind != Channel::Kind::Response)
        throw std::runtime_error("The service does not welcome its peer.");
    if (version > Channel::VERSION_1)
        takeSeals(makeSealKey(Channel::Side::Client, terms, nonce, serviceNonce),
                  makeSealKey(Channel::Side::Service, terms, nonce, serviceNonce));
}

std::string RawPeer::refusal() {
    auto const message = receive();
    if (!message)
        return "closed without a word";
    if (message->kind != Channel::Kind::Error)
        return "no error: " + message->text;
    return isClosed() ? Channel::reasonOf(message->text) : "not closed: " + message->text;
}

void RawPeer::vanish() {
    socket_->socket.set_option(asio::socket_base::linger(true, 0));
    socket_->socket.close();
}

bool RawPeer::isClosed() { return !receive(); }

// --- FakeService

struct FakeService::Running {
    asio::io_context io;
    asio::ip::tcp::acceptor acceptor{io, {asio::ip::address_v4::loopback(), 0}};
    std::thread thread;
};

FakeService::FakeService(std::function<void(RawPeer&)> script, int connections)
    : running_(std::make_unique<Running>()), port_(running_->acceptor.local_endpoint().port()) {
    running_->thread = std::thread([this, connections, script = std::move(script)] {
        for (int i = 0; i < connections; ++i) {
            auto socket = std::make_unique<RawPeer::Socket>();
            running_->acceptor.accept(socket->socket);
            RawPeer peer(std::move(socket));
            script(peer);
        }
    });
}

FakeService::~FakeService() { running_->thread.join(); }

Channel::ClientSettings FakeService::clientSettings() const {
    Channel::ClientSettings settings;
    settings.host = "127.0.0.1";
    settings.port = port_;
    settings.token = TOKEN;
    settings.connectTime = PATIENCE;
    return settings;
}

std::string FakeService::name() const { return "127.0.0.1:" + std::to_string(port_); }

} // namespace ChannelTest
