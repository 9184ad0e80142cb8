#pragma once
// Messages over a stream, one at a time in each direction.

#include "programs/channel/frame.h"
#include "programs/channel/stream.h"

#include <functional>
#include <memory>
#include <optional>
#include <string>

namespace Channel {

struct Received {
    enum class What {
        Message,
        /// A message has begun that is larger than allowed so far.
        Large,
        /// The other side closed the connection between two messages.
        End,
        /// It closed the connection inside a message.
        Cut,
        /// What came is not of this protocol.
        Malformed,
        Broken
    };
    What what;
    Frame message;
    /// One line for a person, when there is no message.
    std::string reason;
};

/// The functions that it is given keep their owner alive, and this object lives as long as one of them is
/// waiting. After close they come back as broken.
class Link : public std::enable_shared_from_this<Link> {
public:
    /// Messages up to this size need not be allowed.
    static constexpr std::size_t SMALL = 64 * 1024;

    explicit Link(std::unique_ptr<Stream> stream) : stream_(std::move(stream)) {}

    void handshake(Stream::Done done);
    std::string fingerprint() const { return stream_->fingerprint(); }

    void limitText(std::uint32_t limit) { decoder_.limitText(limit); }
    /// How large a message may be before it is reported as large.
    void allow(std::size_t size) { allowed_ = size; }
    /// The size of the message that has begun.
    std::size_t announced() const { return decoder_.announced(); }
    /// Called each time when only a part of a message is there.
    void onPart(std::function<void()> onPart) { onPart_ = std::move(onPart); }

    /// What this side's preface says.
    void speak(std::uint16_t version) { version_ = version; }
    /// What the other side's preface says; 0 before it is there.
    std::uint16_t heardVersion() const { return decoder_.version(); }
    /// From the next message on, each one is sealed, in both directions.
    void seal(std::string sendKey, std::string receiveKey);

    /// The message is valid until the next call.
    void receive(std::function<void(Received const&)> done);
    /// Throws Error when the message is too long or cannot be sealed.
    void send(Frame const& message, Stream::Done done);
    /// The bytes that are on their way.
    std::size_t sending() const { return sending_.size(); }
    /// Says that nothing more will come, and throws away what still comes until the other side closes, so
    /// that it gets what was sent last.
    void finish(std::function<void()> done);
    void close();

private:
    void readMore(std::function<void(Received const&)> done);
    void drain(std::size_t left, std::function<void()> done);

    std::unique_ptr<Stream> stream_;
    FrameDecoder decoder_;
    std::size_t allowed_ = SMALL;
    std::function<void()> onPart_;
    std::string sending_;
    std::uint16_t version_ = VERSION;
    bool prefaceSent_ = false;
    std::optional<Seal> seal_;
};

} // namespace Channel
