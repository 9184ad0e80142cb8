#include "programs/channel/server.h"

#include "programs/base/error.h"
#include "programs/base/host_port.h"
#include "programs/channel/peer.h"
#include "programs/channel/token.h"

#include "vlservice/platform/log.h"

#include <boost/asio/error.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/steady_timer.hpp>

#include <sys/resource.h>

#include <chrono>
#include <deque>
#include <list>
#include <sstream>
#include <unordered_set>

namespace Channel {

namespace asio = boost::asio;
using namespace std::chrono_literals;

namespace {

constexpr LogPriority FAILED = 4;
/// Between two attempts to accept when the system has no room for another connection.
constexpr auto ACCEPT_PAUSE = 100ms;

/// Each connection is an open file.
void raiseFileLimit() {
    rlimit limit{};
    if (::getrlimit(RLIMIT_NOFILE, &limit) != 0)
        return;
    limit.rlim_cur = limit.rlim_max;
    ::setrlimit(RLIMIT_NOFILE, &limit);
}

tcp::endpoint endpointOf(ServerSettings const& settings) {
    error_code ec;
    auto const address = asio::ip::make_address(settings.address, ec);
    if (ec)
        throw Base::Error(Base::Code::AddressUnusable,
                          '"' + settings.address + "\" is no IP address to listen on.");
    return {address, settings.port};
}

std::unique_ptr<asio::ssl::context> tlsFor(tcp::endpoint const& endpoint, ServerSettings const& settings) {
    if (settings.tls == Tls::Auto && isLoopback(endpoint.address()))
        return nullptr;
    if (settings.certificateFile.empty() || settings.keyFile.empty())
        throw Base::Error(
            Base::Code::TlsUnusable,
            "TLS on " + settings.address +
                " needs a certificate and its private key; only a loopback address can do without TLS.");
    return makeServiceContext(settings.certificateFile, settings.keyFile);
}

tcp::acceptor listenOn(asio::io_context& io, tcp::endpoint const& endpoint, int socket) {
    try {
        return socket < 0 ? tcp::acceptor(io, endpoint) : tcp::acceptor(io, endpoint.protocol(), socket);
    } catch (boost::system::system_error const& e) {
        std::ostringstream message;
        message << "Cannot listen on " << endpoint << ": " << Base::whyNotListening(e.code().value()) << '.';
        throw Base::Error(Base::Code::AddressUnusable, message.str());
    }
}

} // namespace

class Server::Impl : public PeerContext, public std::enable_shared_from_this<Impl> {
public:
    Impl(asio::io_context& io, ServerSettings settings, Factory factory, Handler handler,
         DataHandler dataHandler)
        : io_(io), settings_(std::move(settings)), factory_(std::move(factory)), handler_(std::move(handler)),
          dataHandler_(std::move(dataHandler)) {
        tcp::endpoint const endpoint = endpointOf(settings_);
        if (settings_.token.size() < MIN_TOKEN_LENGTH)
            throw Base::Error(Base::Code::TokenInvalid, "An access token has at least " +
                                                            std::to_string(MIN_TOKEN_LENGTH) +
                                                            " characters.");
        tls_ = tlsFor(endpoint, settings_);
        if (tls_)
            fingerprint_ = fingerprintOf(*tls_);
        raiseFileLimit();
        acceptor_.emplace(listenOn(io, endpoint, settings_.socket));
        port_ = acceptor_->local_endpoint().port();
        retryTimer_.emplace(io);
    }

    std::uint16_t port() const { return port_; }
    std::optional<long long> certificateEnds() const {
        return tls_ ? std::optional(certificateEnd(*tls_)) : std::nullopt;
    }
    std::size_t connections() const { return peers_.size(); }

    void accept() {
        if (isStopping_ || isAccepting_)
            return;
        if (known() >= settings_.maxConnections)
            return;
        isAccepting_ = true;
        acceptor_->async_accept([self = shared_from_this()](error_code const& ec, tcp::socket socket) {
            self->isAccepting_ = false;
            if (self->isStopping_)
                return;
            if (ec == asio::error::operation_aborted)
                return self->accept();
            if (ec)
                return self->onAcceptFailed(ec);
            self->welcome(std::move(socket));
            self->accept();
        });
    }

    void stop() {
        isStopping_ = true;
        acceptor_.reset();
        retryTimer_.reset();
        for (auto const& peer : std::unordered_set(peers_))
            peer->stop();
    }

    void closeAll() {
        stop();
        for (auto const& peer : std::unordered_set(peers_))
            peer->close();
    }

    // For the peers.
    ServerSettings const& settings() const override { return settings_; }
    std::string const& fingerprint() const override { return fingerprint_; }
    asio::ssl::context* tls() override { return tls_.get(); }
    Factory const& factory() const override { return factory_; }
    Handler const& handler() const override { return handler_; }
    DataHandler const& dataHandler() const override { return dataHandler_; }
    bool isStopping() const override { return isStopping_; }

    void reserve(std::size_t size, std::shared_ptr<Peer> peer) override {
        waiting_.push_back({size, peer});
        grantMemory();
    }

    void release(std::size_t size) override {
        reserved_ -= size;
        grantMemory();
    }

    void holdAnswer(std::shared_ptr<Peer> const& peer, std::size_t size) override {
        std::erase_if(answers_, [&](HeldAnswer const& held) { return held.peer == peer.get(); });
        if (size > Link::SMALL)
            answers_.push_back({peer.get(), size});
        dropAnswers();
    }

    bool mayTellOfStranger() override {
        auto const now = std::chrono::steady_clock::now();
        if (now - tellingSince_ >= settings_.strangersLinesTime) {
            tellWhatWasLeftOut();
            tellingSince_ = now;
            toldOfStrangers_ = 0;
        }
        return ++toldOfStrangers_ <= settings_.strangersLines;
    }

    void know(std::shared_ptr<Peer> const& peer) override {
        strangers_.remove(peer.get());
        // One more may be on its way in; the next ones wait.
        if (known() >= settings_.maxConnections && acceptor_)
            acceptor_->cancel();
    }

    void leave(std::shared_ptr<Peer> const& peer) override {
        strangers_.remove(peer.get());
        peers_.erase(peer);
        accept();
    }

private:
    struct Waiting {
        std::size_t size;
        std::weak_ptr<Peer> peer;
    };

    struct HeldAnswer {
        Peer* peer;
        std::size_t size;
    };

    std::size_t known() const { return peers_.size() - strangers_.size(); }

    void tellWhatWasLeftOut() const {
        if (toldOfStrangers_ > settings_.strangersLines)
            Log::Lock(FAILED).logStreamLine()
                << "Channel: of strangers there were " << toldOfStrangers_ - settings_.strangersLines
                << " more lines.";
    }

    /// The newest one stays: it has just begun.
    void dropAnswers() {
        std::size_t held = 0;
        for (HeldAnswer const& answer : answers_)
            held += answer.size;
        if (answers_.size() > 1 && held > settings_.answerMemory)
            answers_.front().peer->giveUp("Its answer made way for those of others.");
    }

    void dropStrangers() {
        while (strangers_.size() > settings_.maxStrangers)
            strangers_.front()->makeWay();
    }

    /// In the order of asking. A request that is larger than all the memory gets it alone.
    void grantMemory() {
        while (!waiting_.empty()) {
            std::size_t const size = waiting_.front().size;
            if (reserved_ > 0 && reserved_ + size > settings_.requestMemory)
                return;
            auto const peer = waiting_.front().peer.lock();
            waiting_.pop_front();
            if (!peer)
                continue;
            reserved_ += size;
            peer->onReserved(size);
        }
    }

    void welcome(tcp::socket socket) {
        error_code ignored;
        socket.set_option(tcp::no_delay(true), ignored);
        socket.set_option(asio::socket_base::keep_alive(true), ignored);
        auto const peer = Peer::make(io_, shared_from_this(), std::move(socket));
        peers_.insert(peer);
        strangers_.push_back(peer.get());
        dropStrangers();
        peer->start();
    }

    void onAcceptFailed(error_code const& ec) {
        {
            Log::Lock log(FAILED);
            log.logStreamLine() << "Channel cannot accept a connection: " << ec.message() << '.';
        }
        retryTimer_->expires_after(ACCEPT_PAUSE);
        retryTimer_->async_wait([self = shared_from_this()](error_code const& waited) {
            if (!waited)
                self->accept();
        });
    }

    asio::io_context& io_;
    ServerSettings settings_;
    Factory factory_;
    Handler handler_;
    DataHandler dataHandler_;
    std::unique_ptr<asio::ssl::context> tls_;
    std::string fingerprint_;
    std::uint16_t port_ = 0;
    std::optional<tcp::acceptor> acceptor_;
    std::chrono::steady_clock::time_point tellingSince_ = std::chrono::steady_clock::now();
    std::size_t toldOfStrangers_ = 0;
    std::optional<asio::steady_timer> retryTimer_;
    std::unordered_set<std::shared_ptr<Peer>> peers_;
    /// Of the peers, those that have not proved themselves; the oldest first.
    std::list<Peer*> strangers_;
    /// Of the peers, those with a large answer on its way; the oldest first.
    std::deque<HeldAnswer> answers_;
    std::size_t reserved_ = 0;
    std::deque<Waiting> waiting_;
    bool isAccepting_ = false;
    bool isStopping_ = false;
};

Server::Server(asio::io_context& io, ServerSettings settings, Factory factory, Handler handler,
               DataHandler dataHandler)
    : impl_(std::make_shared<Impl>(io, std::move(settings), std::move(factory), std::move(handler),
                                   std::move(dataHandler))) {
    impl_->accept();
}

Server::~Server() { impl_->closeAll(); }

std::uint16_t Server::port() const { return impl_->port(); }
std::string const& Server::fingerprint() const { return impl_->fingerprint(); }
std::optional<long long> Server::certificateEnds() const { return impl_->certificateEnds(); }
std::size_t Server::connections() const { return impl_->connections(); }
void Server::stop() { impl_->stop(); }

std::string tokenIdOf(Ipc::CmdProcessorI const& connection) {
    auto const* const peer = dynamic_cast<Peer const*>(&connection);
    return peer ? peer->tokenId() : std::string();
}

Server::Handler acceptAtOnce(std::shared_ptr<Ipc::CmdProcessorI> processor) {
    return [processor = std::move(processor)](std::shared_ptr<Ipc::CmdI> const& cmd, Answer const& answer) {
        cmd->accept(*processor);
        answer();
    };
}

} // namespace Channel
