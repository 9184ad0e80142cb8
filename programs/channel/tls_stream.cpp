#include "programs/channel/stream.h"

#include <boost/asio/buffer.hpp>
#include <boost/asio/error.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/ssl/error.hpp>
#include <boost/asio/write.hpp>

#include <openssl/bio.h>
#include <openssl/err.h>
#include <openssl/ssl.h>

#include <sys/socket.h>

#include <algorithm>
#include <cerrno>
#include <new>
#include <optional>
#include <utility>

namespace Channel {

namespace asio = boost::asio;

namespace {

/// What is taken from the socket at once, and about what is given to it at once: several records, since each
/// turn costs as much as copying some of them.
constexpr std::size_t AT_ONCE = 128 * 1024;

/// The sealed bytes of a connection on their way between the TLS library and its socket. What comes is read
/// from the socket as the library asks for it, what goes out waits until somebody takes it.
class SealedBytes {
public:
    explicit SealedBytes(tcp::socket& socket) : socket_(socket) {}

    bool hasOutgoing() const { return !outgoing_.empty(); }
    std::size_t outgoing() const { return outgoing_.size(); }
    std::string takeOutgoing() { return std::exchange(outgoing_, {}); }
    /// Why nothing more comes.
    std::optional<error_code> const& end() const { return end_; }

    /// For the library, which takes them over.
    BIO* makeBio() {
        BIO* const bio = BIO_new(method());
        if (!bio)
            throw std::bad_alloc();
        BIO_set_data(bio, this);
        BIO_set_init(bio, 1);
        return bio;
    }

private:
    static BIO_METHOD* method() {
        static BIO_METHOD* const method = makeMethod();
        return method;
    }
    static BIO_METHOD* makeMethod() {
        BIO_METHOD* const made = BIO_meth_new(BIO_get_new_index() | BIO_TYPE_SOURCE_SINK, "sealed bytes");
        if (!made || BIO_meth_set_read_ex(made, &SealedBytes::onRead) != 1 ||
            BIO_meth_set_write_ex(made, &SealedBytes::onWrite) != 1 ||
            BIO_meth_set_ctrl(made, &SealedBytes::onControl) != 1)
            throw std::bad_alloc();
        return made;
    }
    static SealedBytes& of(BIO* bio) { return *static_cast<SealedBytes*>(BIO_get_data(bio)); }

    // They are called by C.

    static int onRead(BIO* bio, char* to, std::size_t size, std::size_t* got) noexcept {
        BIO_clear_retry_flags(bio);
        SealedBytes& bytes = of(bio);
        *got = bytes.read(to, size);
        if (*got == 0 && !bytes.end_)
            BIO_set_retry_read(bio);
        return *got > 0;
    }
    static int onWrite(BIO* bio, char const* from, std::size_t size, std::size_t* written) noexcept {
        BIO_clear_retry_flags(bio);
        try {
            of(bio).outgoing_.append(from, size);
        } catch (std::bad_alloc const&) {
            return 0;
        }
        *written = size;
        return 1;
    }
    static long onControl(BIO* bio, int what, long, void*) noexcept {
        return what == BIO_CTRL_FLUSH || (what == BIO_CTRL_EOF && of(bio).end_.has_value());
    }

    /// 0 where nothing is there.
    std::size_t read(char* to, std::size_t size) noexcept {
        if (incoming_.empty())
            receive();
        std::size_t const some = std::min(size, incoming_.size());
        std::copy_n(incoming_.data(), some, to);
        incoming_.remove_prefix(some);
        return some;
    }
    void receive() noexcept {
        if (!room_)
            room_.reset(new (std::nothrow) char[AT_ONCE]);
        if (!room_) {
            end_ = asio::error::no_memory;
            return;
        }
        incoming_ = {room_.get(), receiveSome()};
        // A connection that is silent keeps no memory.
        if (incoming_.empty())
            room_.reset();
    }
    std::size_t receiveSome() noexcept {
        ssize_t size = 0;
        do
            size = ::recv(socket_.native_handle(), room_.get(), AT_ONCE, MSG_DONTWAIT);
        while (size < 0 && errno == EINTR);
        if (size == 0)
            end_ = asio::ssl::error::stream_truncated;
        else if (size < 0 && errno != EAGAIN && errno != EWOULDBLOCK)
            end_ = error_code(errno, boost::system::system_category());
        return size > 0 ? static_cast<std::size_t>(size) : 0;
    }

    tcp::socket& socket_;
    std::unique_ptr<char[]> room_;
    /// What of it the library has not asked for yet.
    std::string_view incoming_;
    std::string outgoing_;
    std::optional<error_code> end_;
};

class TlsStream : public Stream {
public:
    TlsStream(tcp::socket socket, asio::ssl::context& context, TlsRole role)
        : socket_(std::move(socket)), bytes_(socket_), ssl_(SSL_new(context.native_handle()), SSL_free) {
        if (!ssl_)
            throw std::bad_alloc();
        BIO* const bio = bytes_.makeBio();
        SSL_set_bio(ssl_.get(), bio, bio);
        SSL_set_mode(ssl_.get(), SSL_MODE_ENABLE_PARTIAL_WRITE | SSL_MODE_ACCEPT_MOVING_WRITE_BUFFER |
                                     SSL_MODE_RELEASE_BUFFERS);
        role == TlsRole::Client ? SSL_set_connect_state(ssl_.get()) : SSL_set_accept_state(ssl_.get());
    }

    void handshake(Done done) override {
        Step const step = next([this] { return SSL_do_handshake(ssl_.get()); });
        if (step.what == Step::What::Waits && !bytes_.hasOutgoing())
            return awaitBytes(
                [this, done = std::move(done)](error_code const& ec) { ec ? done(ec) : handshake(done); });
        // What the other side is told of a failure, too.
        writeAll({}, [this, step, done = std::move(done)](error_code const& ec) {
            if (step.what == Step::What::Failed || ec)
                return done(step.what == Step::What::Failed ? step.why : ec);
            step.what == Step::What::Done ? done({}) : handshake(done);
        });
    }

    void readSome(std::span<char> room, Moved done) override {
        std::size_t filled = 0;
        Step step = failed_.value_or(Step{Step::What::Done});
        while (step.what == Step::What::Done && filled < std::min(room.size(), AT_ONCE)) {
            std::size_t size = 0;
            step = next(
                [&] { return SSL_read_ex(ssl_.get(), room.data() + filled, room.size() - filled, &size); });
            filled += size;
        }
        // The library has things to say of its own, which nobody waits for.
        if (bytes_.hasOutgoing() && !isSending_)
            send({});
        if (step.what == Step::What::Failed)
            failed_ = step;
        if (filled > 0 || step.what == Step::What::Failed)
            return asio::post(socket_.get_executor(),
                              [done = std::move(done), filled, why = filled > 0 ? error_code() : step.why] {
                                  done(why, filled);
                              });
        awaitBytes([this, room, done = std::move(done)](error_code const& ec) {
            ec ? done(ec, 0) : readSome(room, done);
        });
    }

    void writeAll(std::string_view bytes, Done done) override {
        plain_ = bytes;
        if (isSending_)
            waiting_.lock()->written = std::move(done);
        else
            send(std::move(done));
    }

    std::string fingerprint() override {
        std::unique_ptr<X509, decltype(&X509_free)> const certificate(SSL_get1_peer_certificate(ssl_.get()),
                                                                      X509_free);
        return fingerprintOf(certificate.get());
    }
    tcp::socket& socket() override { return socket_; }

private:
    /// What a call of the library has come to.
    struct Step {
        enum class What { Done, Waits, Failed };
        What what;
        error_code why = {};
    };

    template<typename Call>
    Step next(Call call) {
        ERR_clear_error();
        int const result = call();
        if (result == 1)
            return {Step::What::Done};
        switch (SSL_get_error(ssl_.get(), result)) {
        case SSL_ERROR_WANT_READ:
            return {Step::What::Waits};
        case SSL_ERROR_ZERO_RETURN:
            return {Step::What::Failed, asio::error::eof};
        default:
            return {Step::What::Failed, failure()};
        }
    }
    error_code failure() const {
        if (bytes_.end())
            return *bytes_.end();
        if (auto const error = static_cast<int>(ERR_get_error()))
            return {error, asio::error::get_ssl_category()};
        return asio::ssl::error::unexpected_result;
    }

    template<typename Next>
    void awaitBytes(Next then) {
        socket_.async_wait(tcp::socket::wait_read, std::move(then));
    }

    /// Seals some more of what is to go out.
    error_code sealSome() {
        while (!plain_.empty() && bytes_.outgoing() < AT_ONCE) {
            std::size_t size = 0;
            Step const step =
                next([&] { return SSL_write_ex(ssl_.get(), plain_.data(), plain_.size(), &size); });
            if (step.what != Step::What::Done)
                return step.what == Step::What::Failed ? step.why : asio::error::no_memory;
            plain_.remove_prefix(size);
        }
        return {};
    }

    /// On its way to the socket, and who waits for that. The handler owns it: what is never run leaves
    /// nothing.
    struct Sending {
        std::string bytes;
        Done written;
    };

    /// Goes on until all is with the socket.
    void send(Done written) {
        isSending_ = true;
        error_code const unsealed = sealSome();
        auto const sending = std::make_shared<Sending>(Sending{bytes_.takeOutgoing(), std::move(written)});
        waiting_ = sending;
        auto onSent = [this, sending, unsealed, life = std::weak_ptr(life_)](error_code const& ec,
                                                                             std::size_t) {
            // Nobody waits for what the library says of its own, and the stream may be gone.
            if (!life.expired())
                onSealedSent(*sending, unsealed ? unsealed : ec);
        };
        if (sending->bytes.empty())
            return asio::post(socket_.get_executor(), [onSent = std::move(onSent)] { onSent({}, 0); });
        asio::async_write(socket_, asio::buffer(sending->bytes), std::move(onSent));
    }
    void onSealedSent(Sending& sent, error_code const& ec) {
        isSending_ = false;
        Done written = std::exchange(sent.written, nullptr);
        if (!ec && (!plain_.empty() || bytes_.hasOutgoing()))
            return send(std::move(written));
        plain_ = {};
        if (written)
            written(ec);
    }

    tcp::socket socket_;
    SealedBytes bytes_;
    std::unique_ptr<SSL, decltype(&SSL_free)> ssl_;
    /// Why nothing more can be read.
    std::optional<Step> failed_;
    /// What is to go out and is not sealed yet.
    std::string_view plain_;
    bool isSending_ = false;
    std::weak_ptr<Sending> waiting_;
    std::shared_ptr<int> const life_ = std::make_shared<int>();
};

} // namespace

std::unique_ptr<Stream> makeTlsStream(tcp::socket socket, asio::ssl::context& context, TlsRole role) {
    return std::make_unique<TlsStream>(std::move(socket), context, role);
}

} // namespace Channel
