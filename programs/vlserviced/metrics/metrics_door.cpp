#include "programs/vlserviced/metrics/metrics_door.h"

#include "programs/base/error.h"
#include "programs/base/host_port.h"
#include "programs/base/out_of_memory.h"
#include "programs/base/plain_text.h"
#include "programs/base/quoting.h"
#include "programs/vlserviced/metrics/http_answer.h"
#include "vlservice/platform/log.h"

#include <utility>

#include <boost/asio/generic/stream_protocol.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/local/stream_protocol.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/asio/write.hpp>

#include <array>
#include <charconv>
#include <chrono>
#include <cstdint>
#include <exception>
#include <list>
#include <new>
#include <optional>
#include <sys/stat.h>
#include <thread>
#include <unistd.h>
#include <variant>

namespace VlServiced {
namespace {

namespace asio = boost::asio;
using asio::ip::tcp;
using boost::system::error_code;
using Local = asio::local::stream_protocol;
using AnySocket = asio::generic::stream_protocol::socket;

constexpr std::size_t MAX_PEERS = 16;
/// For a request, its answer and the peer's leave.
constexpr std::chrono::seconds PEER_TIME{10};
constexpr std::chrono::milliseconds ACCEPT_PAUSE{100};
constexpr std::string_view UNIX = "unix:";

constexpr char const* WANTED = "--metrics takes a loopback address with a port, such as 127.0.0.1:9117, or "
                               "unix:PATH, and got ";

[[noreturn]] void refuse(std::string const& place) {
    throw Base::Error(Base::Code::Usage, WANTED + Base::inQuotes(Base::oneLine(place)));
}

tcp::endpoint endpointIn(std::string const& place) {
    std::size_t const colon = place.rfind(':');
    if (colon == std::string::npos)
        refuse(place);
    std::string host = place.substr(0, colon);
    if (host.starts_with('[') && host.ends_with(']'))
        host = host.substr(1, host.size() - 2);
    std::uint16_t port = 0;
    char const* const end = place.data() + place.size();
    auto const [behind, wrong] = std::from_chars(place.data() + colon + 1, end, port);
    error_code failure;
    auto const address = asio::ip::make_address(host, failure);
    if (failure || wrong != std::errc() || behind != end || !address.is_loopback())
        refuse(place);
    return {address, port};
}

[[noreturn]] void failToListen(std::string const& place, error_code const& why) {
    throw Base::Error(Base::Code::AddressUnusable, "Cannot listen for metrics on " + Base::oneLine(place) +
                                                       ": " + Base::whyNotListening(why.value()) + '.');
}

bool isSocket(std::string const& path) {
    struct stat status {};
    return ::lstat(path.c_str(), &status) == 0 && S_ISSOCK(status.st_mode);
}

/// What a process that was killed has left; whoever listens there keeps it.
void removeStale(asio::io_context& io, std::string const& path) {
    Local::socket probe(io);
    error_code failure;
    probe.connect(Local::endpoint(path), failure);
    if (failure == asio::error::connection_refused && isSocket(path))
        ::unlink(path.c_str());
}

Local::acceptor listenAt(asio::io_context& io, std::string const& path) {
    // As long as an address of this kind can be, with the zero behind it.
    constexpr std::size_t MAX_PATH_BYTES = 107;
    if (!path.starts_with('/') || !Base::isPlainText(path, MAX_PATH_BYTES))
        refuse(std::string(UNIX) + path);
    removeStale(io, path);
    Local::acceptor acceptor(io);
    acceptor.open();
    error_code failure;
    acceptor.bind(Local::endpoint(path), failure);
    if (failure)
        failToListen(std::string(UNIX) + path, failure);
    // Nobody can connect before it listens.
    ::chmod(path.c_str(), S_IRUSR | S_IWUSR | S_IRGRP | S_IWGRP);
    acceptor.listen();
    return acceptor;
}

tcp::acceptor listenAt(asio::io_context& io, tcp::endpoint const& endpoint, std::string const& place) {
    try {
        return tcp::acceptor(io, endpoint);
    } catch (boost::system::system_error const& failure) {
        failToListen(place, failure.code());
    }
}

using Acceptor = std::variant<tcp::acceptor, Local::acceptor>;

Acceptor acceptorAt(asio::io_context& io, std::string const& place) {
    if (place.starts_with(UNIX))
        return listenAt(io, place.substr(UNIX.size()));
    return listenAt(io, endpointIn(place), place);
}

/// One request, its answer, and the end. It lives as long as something of it is under way.
class MetricsPeer : public std::enable_shared_from_this<MetricsPeer> {
public:
    MetricsPeer(AnySocket socket, std::function<std::string()> const& page)
        : socket_(std::move(socket)), due_(socket_.get_executor()), page_(page) {}

    void start() {
        due_.expires_after(PEER_TIME);
        due_.async_wait([weak = weak_from_this()](error_code const& ec) {
            if (auto const self = weak.lock(); self && !ec)
                self->close();
        });
        read();
    }

    void close() {
        error_code ignored;
        socket_.close(ignored);
        due_.cancel();
    }

private:
    void read() {
        socket_.async_read_some(asio::buffer(room_),
                                [self = shared_from_this()](error_code const& ec, std::size_t size) {
                                    ec ? self->close() : self->onRead(size);
                                });
    }

    void onRead(std::size_t size) {
        // What comes behind the request is passed over, and ends with the peer's time.
        if (!answer_.empty())
            return read();
        received_.append(room_.data(), size);
        std::optional<std::string> answer = metricsAnswer(received_, page_);
        if (!answer)
            return read();
        answer_ = std::move(*answer);
        asio::async_write(socket_, asio::buffer(answer_),
                          [self = shared_from_this()](error_code const& ec, std::size_t) {
                              ec ? self->close() : self->onWritten();
                          });
    }

    /// A peer that has not read all of it yet would lose it with a connection that is closed.
    void onWritten() {
        error_code ignored;
        socket_.shutdown(asio::socket_base::shutdown_send, ignored);
        read();
    }

    AnySocket socket_;
    asio::steady_timer due_;
    std::function<std::string()> const& page_;
    std::array<char, 1024> room_;
    std::string received_;
    std::string answer_;
};

} // namespace

class MetricsDoor::Impl {
public:
    explicit Impl(std::string const& place) : place_(place), acceptor_(acceptorAt(io_, place)), pause_(io_) {
        if (auto const* const acceptor = std::get_if<tcp::acceptor>(&acceptor_)) {
            tcp::endpoint const endpoint = acceptor->local_endpoint();
            place_ = Base::hostPortText(endpoint.address().to_string(), endpoint.port());
        }
    }

    ~Impl() {
        io_.stop();
        if (thread_.joinable())
            thread_.join();
        if (place_.starts_with(UNIX))
            ::unlink(place_.c_str() + UNIX.size());
    }

    std::string const& place() const { return place_; }

    void open(std::function<std::string()> page) {
        page_ = std::move(page);
        accept();
        thread_ = std::thread([this] { run(); });
    }

private:
    void run() {
        for (;;) {
            try {
                io_.run();
                return;
            } catch (std::bad_alloc const&) {
                Base::endOutOfMemory();
            } catch (std::exception const& failure) {
                Log::Lock(4).logStreamLine() << "Metrics cannot be told. " << Base::oneLine(failure.what());
            }
        }
    }

    void accept() {
        std::visit(
            [this](auto& acceptor) {
                acceptor.async_accept([this](error_code const& ec, auto socket) {
                    ec ? pause() : welcome(AnySocket(std::move(socket)));
                });
            },
            acceptor_);
    }

    /// The system has no room for another connection.
    void pause() {
        pause_.expires_after(ACCEPT_PAUSE);
        pause_.async_wait([this](error_code const& ec) {
            if (!ec)
                accept();
        });
    }

    void welcome(AnySocket socket) {
        auto const peer = std::make_shared<MetricsPeer>(std::move(socket), page_);
        peers_.remove_if([](auto const& one) { return one.expired(); });
        peers_.push_back(peer);
        if (peers_.size() > MAX_PEERS) {
            if (auto const oldest = peers_.front().lock())
                oldest->close();
            peers_.pop_front();
        }
        accept();
        peer->start();
    }

    std::function<std::string()> page_;
    std::string place_;
    asio::io_context io_{1};
    Acceptor acceptor_;
    asio::steady_timer pause_;
    /// The oldest first.
    std::list<std::weak_ptr<MetricsPeer>> peers_;
    std::thread thread_;
};

MetricsDoor::MetricsDoor(std::string const& place) : impl_(std::make_unique<Impl>(place)) {}
MetricsDoor::~MetricsDoor() = default;

std::string const& MetricsDoor::place() const { return impl_->place(); }
void MetricsDoor::open(std::function<std::string()> page) { impl_->open(std::move(page)); }

} // namespace VlServiced
