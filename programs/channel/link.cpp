#include "programs/channel/link.h"
#include "programs/base/error.h"

#include <boost/asio/error.hpp>
#include <boost/asio/ssl/error.hpp>

#include <optional>

namespace Channel {
namespace {

using What = Received::What;

/// What is thrown away at the end at the most.
constexpr std::size_t DRAINED = 1024 * 1024;

/// Under TLS a socket that is closed without a farewell counts as cut; messages have lengths, so nothing can
/// be cut unseen.
bool isEnd(error_code const& ec) {
    return ec == boost::asio::error::eof || ec == boost::asio::ssl::error::stream_truncated;
}

} // namespace

void Link::handshake(Stream::Done done) {
    stream_->handshake(
        [self = shared_from_this(), done = std::move(done)](error_code const& ec) { done(ec); });
}

void Link::receive(std::function<void(Received const&)> done) {
    std::optional<Received> received;
    try {
        if (auto const message = decoder_.next())
            received = Received{What::Message, *message, {}};
        else if (decoder_.announced() > allowed_)
            received = Received{What::Large, {}, {}};
    } catch (Base::Error const& e) {
        received = Received{What::Malformed, {}, e.what()};
    }
    if (received)
        return done(*received);
    if (onPart_ && decoder_.isInside())
        onPart_();
    readMore(std::move(done));
}

void Link::readMore(std::function<void(Received const&)> done) {
    stream_->readSome(decoder_.room(), [self = shared_from_this(), done = std::move(done)](
                                           error_code const& ec, std::size_t size) mutable {
        if (!ec) {
            self->decoder_.commit(size);
            self->receive(std::move(done));
        } else if (!isEnd(ec)) {
            done({What::Broken, {}, ec.message() + '.'});
        } else if (self->decoder_.isInside()) {
            done({What::Cut, {}, "The connection ended in the middle of a message."});
        } else {
            done({What::End, {}, "The other side closed the connection."});
        }
    });
}

void Link::seal(std::string sendKey, std::string receiveKey) {
    seal_.emplace(std::move(sendKey));
    decoder_.expectSeals(std::move(receiveKey));
}

void Link::send(Frame const& message, Stream::Done done) {
    std::string bytes;
    appendFrame(bytes, message);
    if (seal_)
        bytes += seal_->next(bytes);
    sending_ = prefaceSent_ ? std::move(bytes) : preface(version_) + bytes;
    prefaceSent_ = true;
    stream_->writeAll(sending_, [self = shared_from_this(), done = std::move(done)](error_code const& ec) {
        self->sending_ = std::string();
        done(ec);
    });
}

void Link::finish(std::function<void()> done) {
    error_code ignored;
    stream_->socket().shutdown(tcp::socket::shutdown_send, ignored);
    drain(DRAINED, std::move(done));
}

void Link::drain(std::size_t left, std::function<void()> done) {
    decoder_ = FrameDecoder();
    stream_->readSome(decoder_.room(), [self = shared_from_this(), left, done = std::move(done)](
                                           error_code const& ec, std::size_t size) mutable {
        if (ec || size >= left)
            done();
        else
            self->drain(left - size, std::move(done));
    });
}

void Link::close() {
    error_code ignored;
    stream_->socket().close(ignored);
}

} // namespace Channel
