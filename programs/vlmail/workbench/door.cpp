#include "programs/vlmail/workbench/door.h"

#include "programs/base/error.h"

#include <utility>

#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/asio/write.hpp>

#include <array>
#include <list>
#include <string>
#include <variant>

namespace VlMail::Workbench {
namespace {

namespace asio = boost::asio;
using asio::ip::tcp;
using boost::system::error_code;

constexpr std::chrono::milliseconds ACCEPT_PAUSE{100};

/// One connection. It lives as long as something of it is under way.
class Peer : public std::enable_shared_from_this<Peer> {
public:
    Peer(tcp::socket socket, PeerTimes times, std::shared_ptr<Door::Handler const> handler)
        : socket_(std::move(socket)), due_(socket_.get_executor()), times_(times),
          handler_(std::move(handler)) {}

    void start() { next(); }
    /// Whether it waits for an answer; then it is not closed to make room.
    bool isServed() const { return isServed_; }

    void close() {
        error_code ignored;
        socket_.close(ignored);
        due_.cancel();
    }

private:
    void closeIn(std::chrono::milliseconds time) {
        due_.expires_after(time);
        due_.async_wait([weak = weak_from_this()](error_code const& ec) {
            if (auto const self = weak.lock(); self && !ec)
                self->close();
        });
    }

    void next() {
        if (auto taken = reader_.take())
            return std::visit([this](auto& what) { take(std::move(what)); }, *taken);
        if (reader_.isBetweenRequests())
            closeIn(times_.idle);
        else if (!hasRequestTime_)
            beginRequest();
        read();
    }

    void beginRequest() {
        hasRequestTime_ = true;
        closeIn(times_.request);
    }

    void read() {
        socket_.async_read_some(asio::buffer(room_),
                                [self = shared_from_this()](error_code const& ec, std::size_t size) {
                                    ec ? self->close() : self->onRead(size);
                                });
    }

    void onRead(std::size_t size) {
        // What comes behind the last request is passed over, and ends with the peer's time.
        if (isLeaving_)
            return read();
        reader_.put({room_.data(), size});
        next();
    }

    void take(Request request) {
        due_.cancel();
        isServed_ = true;
        keepsAlive_ = request.keepsAlive;
        // Nothing is read of a peer that waits: whoever is to answer keeps it alive.
        (*handler_)(std::move(request),
                    [self = shared_from_this()](Answer const& what) { self->answer(what); });
    }

    /// No request: the connection ends behind the answer.
    void take(Answer const& refusal) {
        keepsAlive_ = false;
        answer(refusal);
    }

    void answer(Answer const& what) {
        isServed_ = false;
        hasRequestTime_ = false;
        written_ = wireTextOf(what, keepsAlive_);
        closeIn(times_.request);
        asio::async_write(socket_, asio::buffer(written_),
                          [self = shared_from_this()](error_code const& ec, std::size_t) {
                              ec ? self->close() : self->onWritten();
                          });
    }

    /// A peer that has not read all of it yet would lose it with a connection that is closed.
    void onWritten() {
        if (keepsAlive_)
            return next();
        error_code ignored;
        socket_.shutdown(asio::socket_base::shutdown_send, ignored);
        isLeaving_ = true;
        read();
    }

    tcp::socket socket_;
    asio::steady_timer due_;
    PeerTimes times_;
    std::shared_ptr<Door::Handler const> handler_;
    RequestReader reader_;
    std::array<char, 16384> room_;
    std::string written_;
    bool keepsAlive_ = true;
    bool isServed_ = false;
    bool isLeaving_ = false;
    bool hasRequestTime_ = false;
};

tcp::acceptor listenHere(asio::io_context& io) {
    try {
        return tcp::acceptor(io, tcp::endpoint(asio::ip::address_v4::loopback(), 0));
    } catch (boost::system::system_error const& failure) {
        throw Base::Error(Base::Code::AddressUnusable,
                          "cannot listen at 127.0.0.1: " + failure.code().message() +
                              "; close other programs and begin again");
    }
}

} // namespace

class Door::Impl : public std::enable_shared_from_this<Impl> {
public:
    Impl(asio::io_context& io, PeerTimes times) : acceptor_(listenHere(io)), pause_(io), times_(times) {}

    std::uint16_t port() const { return acceptor_.local_endpoint().port(); }

    void open(Handler handler) {
        handler_ = std::make_shared<Handler const>(std::move(handler));
        accept();
    }

    void close() {
        error_code ignored;
        acceptor_.close(ignored);
        pause_.cancel();
        for (auto const& peer : peers_)
            if (auto const alive = peer.lock())
                alive->close();
    }

private:
    void accept() {
        acceptor_.async_accept([self = shared_from_this()](error_code const& ec, tcp::socket socket) {
            if (self->acceptor_.is_open())
                ec ? self->pause() : self->welcome(std::move(socket));
        });
    }

    /// The system has no room for another connection.
    void pause() {
        pause_.expires_after(ACCEPT_PAUSE);
        pause_.async_wait([self = shared_from_this()](error_code const& ec) {
            if (!ec)
                self->accept();
        });
    }

    void welcome(tcp::socket socket) {
        auto const peer = std::make_shared<Peer>(std::move(socket), times_, handler_);
        peers_.remove_if([](auto const& one) { return one.expired(); });
        peers_.push_back(peer);
        if (peers_.size() > MAX_PEERS)
            closeOldest();
        accept();
        peer->start();
    }

    void closeOldest() {
        for (auto at = peers_.begin(); at != peers_.end(); ++at)
            if (auto const peer = at->lock(); peer && !peer->isServed()) {
                peer->close();
                peers_.erase(at);
                return;
            }
    }

    tcp::acceptor acceptor_;
    asio::steady_timer pause_;
    PeerTimes times_;
    std::shared_ptr<Handler const> handler_;
    /// The oldest first.
    std::list<std::weak_ptr<Peer>> peers_;
};

Door::Door(asio::io_context& io, PeerTimes times) : impl_(std::make_shared<Impl>(io, times)) {}
Door::~Door() { impl_->close(); }

std::uint16_t Door::port() const { return impl_->port(); }
void Door::open(Handler handler) { impl_->open(std::move(handler)); }

} // namespace VlMail::Workbench
