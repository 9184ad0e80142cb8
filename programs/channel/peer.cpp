#include "programs/channel/peer.h"

#include "programs/base/error.h"
#include "programs/channel/data_message.h"
#include "programs/channel/message_text.h"
#include "programs/channel/token.h"

#include "vlservice/platform/log.h"

#include <boost/asio/buffer.hpp>
#include <boost/asio/dispatch.hpp>
#include <boost/asio/error.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/post.hpp>

#include <array>
#include <atomic>
#include <sstream>

namespace Channel {

namespace asio = boost::asio;

namespace {

constexpr LogPriority FAILED = 4;
constexpr LogPriority TRACE = 7;

/// What a TLS client begins with.
constexpr char TLS_HANDSHAKE = 0x16;

std::string nameOf(tcp::socket const& socket) {
    error_code ec;
    std::ostringstream name;
    name << socket.remote_endpoint(ec);
    return name.str();
}

} // namespace

// --- answers

class Answer::State {
public:
    State(asio::io_context& io, std::weak_ptr<Peer> peer) : io_(io), peer_(std::move(peer)) {}
    ~State() { end("The service gave no answer."); }

    void end(std::optional<std::string> failure, Peer::Telling telling = Peer::Telling::Log) {
        if (isEnded_.exchange(true) || peer_.expired())
            return;
        asio::dispatch(io_, [weak = peer_, failure = std::move(failure), telling] {
            if (auto const peer = weak.lock())
                peer->answered(failure, telling);
        });
    }

private:
    asio::io_context& io_;
    std::weak_ptr<Peer> peer_;
    std::atomic<bool> isEnded_ = false;
};

class DataStored::State {
public:
    State(asio::io_context& io, std::weak_ptr<PeerContext> context, std::weak_ptr<Peer> peer,
          std::uint32_t sequence, std::size_t size, std::uint32_t round, std::size_t reserved)
        : io_(io), context_(std::move(context)), peer_(std::move(peer)), sequence_(sequence), size_(size),
          round_(round), reserved_(reserved) {}
    ~State() { end("The service has lost it."); }

    void end(std::optional<std::string> failure) {
        if (isEnded_.exchange(true) || context_.expired())
            return;
        asio::dispatch(io_, [context = context_, peer = peer_, sequence = sequence_, size = size_,
                             round = round_, reserved = reserved_, failure = std::move(failure)] {
            if (auto const told = peer.lock())
                told->dataStored(sequence, size, round, failure);
            if (auto const shared = context.lock())
                shared->release(reserved);
        });
    }

private:
    asio::io_context& io_;
    std::weak_ptr<PeerContext> context_;
    std::weak_ptr<Peer> peer_;
    std::uint32_t sequence_;
    std::size_t size_;
    std::uint32_t round_;
    std::size_t reserved_;
    std::atomic<bool> isEnded_ = false;
};

void DataStored::operator()() const { state_->end(std::nullopt); }
void DataStored::fail(std::string const& reason) const { state_->end(reason); }

void Answer::operator()() const { state_->end(std::nullopt); }
void Answer::fail(std::string const& reason) const { state_->end(reason); }
void Answer::refuse(std::string const& reason) const { state_->end(reason, Peer::Telling::Nobody); }

// --- from connection to greeting

std::shared_ptr<Peer> Peer::make(asio::io_context& io, std::shared_ptr<PeerContext> context,
                                 tcp::socket socket) {
    std::shared_ptr<Peer> peer(new Peer(io, std::move(context), std::move(socket)));
    peer->deadline_.emplace(io, [weak = std::weak_ptr(peer)] {
        if (auto const self = weak.lock())
            self->onDue();
    });
    peer->writeDeadline_.emplace(io, [weak = std::weak_ptr(peer)] {
        if (auto const self = weak.lock())
            self->giveUp("It does not take its answer.");
    });
    return peer;
}

Peer::Peer(asio::io_context& io, std::shared_ptr<PeerContext> context, tcp::socket socket)
    : context_(std::move(context)), io_(io), name_(nameOf(socket)), socket_(std::move(socket)) {}

Terms Peer::terms() const {
    std::uint16_t const version = link_->heardVersion();
    if (context_->tls())
        return {version, context_->settings().token, context_->fingerprint(), {}, {}};
    return {version, context_->settings().token, {}, ends_.other, ends_.own};
}

void Peer::start() {
    log(TRACE, "It connects.");
    setDeadline(context_->settings().greetingTime, "It does not greet.");
    if (context_->tls()) {
        expectTls();
    } else {
        orGiveUp([&] {
            ends_ = endsOf(*socket_);
            link_ = std::make_shared<Link>(makePlainStream(*std::exchange(socket_, std::nullopt)));
            receive();
        });
    }
}

void Peer::expectTls() {
    socket_->async_wait(tcp::socket::wait_read,
                        [self = shared_from_this()](error_code const& ec) { self->onFirstByte(ec); });
}

void Peer::onFirstByte(error_code const& waited) {
    if (state_ == State::Closed)
        return;
    std::array<char, PREFACE_SIZE> first{};
    std::size_t size = 0;
    error_code ec = waited;
    if (!ec)
        socket_->non_blocking(true, ec);
    if (!ec)
        size = socket_->receive(asio::buffer(first), tcp::socket::message_peek, ec);
    if (ec == asio::error::would_block)
        return expectTls();
    if (ec) {
        log(TRACE, "It left before it said anything.");
        return close();
    }
    tcp::socket socket = *std::exchange(socket_, std::nullopt);
    if (first.front() == TLS_HANDSHAKE) {
        link_ = std::make_shared<Link>(makeTlsStream(std::move(socket), *context_->tls(), TlsRole::Service));
        shakeHands();
    } else {
        link_ = std::make_shared<Link>(makePlainStream(std::move(socket)));
        link_->speak(versionIn({first.data(), size}).value_or(VERSION));
        refuse("This service speaks TLS alone.");
    }
}

void Peer::shakeHands() {
    link_->handshake([self = shared_from_this()](error_code const& ec) {
        if (self->state_ == State::Closed)
            return;
        if (ec)
            return self->giveUp("TLS failed: " + ec.message() + '.');
        self->receive();
    });
}

// --- receiving

void Peer::receive() {
    if (state_ == State::Greeting)
        link_->limitText(MAX_GREETING);
    link_->receive([self = shared_from_this()](Received const& received) {
        self->orGiveUp([&] { self->onReceived(received); });
    });
}

void Peer::onReceived(Received const& received) {
    if (state_ == State::Leaving || state_ == State::Closed)
        return;
    switch (received.what) {
    case Received::What::Message:
        return onMessage(received.message);
    case Received::What::Large:
        return onLarge();
    case Received::What::Cut:
    case Received::What::Malformed:
        return refuse(received.reason);
    case Received::What::End:
        log(TRACE, received.reason);
        return close();
    case Received::What::Broken:
        return giveUp(received.reason);
    }
}

void Peer::onPart() {
    if (state_ == State::Ready && !std::exchange(isInsideMessage_, true))
        setDeadline(context_->settings().messageTime, "The rest of its message does not come.");
}

void Peer::onLarge() {
    // While it waits for others, its time stands still.
    deadline_->clear();
    isInsideMessage_ = false;
    context_->reserve(link_->announced(), shared_from_this());
}

void Peer::onReserved(std::size_t size) {
    if (state_ == State::Closed)
        return context_->release(size);
    reserved_ = size;
    if (data_)
        return takeData();
    link_->allow(size);
    receive();
}

void Peer::onMessage(Frame const& message) {
    switch (state_) {
    case State::Greeting:
        return onGreeting(message);
    case State::Ready:
        return onRequest(message);
    case State::Leaving:
    case State::Closed:
        return;
    }
}

// --- the greeting

void Peer::onGreeting(Frame const& message) {
    if (!greeting_) {
        link_->speak(link_->heardVersion());
        greeting_.emplace(terms(), makeNonce(), context_->dataHandler() ? TakesData::Yes : TakesData::No,
                          context_->settings().tokens);
    }
    GreetingStep const step = greeting_->take(message);
    switch (step.verdict) {
    case GreetingStep::Verdict::GoesOn:
        return write(step.reply->frame(), [this] { receive(); });
    case GreetingStep::Verdict::Welcome:
        isKnown_ = true;
        tokenId_ = greeting_->tokenId();
        context_->know(shared_from_this());
        return write(step.reply->frame(), [this, seals = step.seals] { onWelcome(seals); });
    case GreetingStep::Verdict::Refused:
        return refuse(step.reason);
    }
}

void Peer::onWelcome(std::optional<SealKeys> const& seals) {
    greeting_.reset();
    if (seals)
        link_->seal(seals->service, seals->client);
    state_ = State::Ready;
    deadline_->clear();
    link_->limitText(MAX_TEXT);
    link_->onPart([weak = weak_from_this()] {
        if (auto const self = weak.lock())
            self->onPart();
    });
    receive();
}

// --- requests

void Peer::onRequest(Frame const& message) {
    isInsideMessage_ = false;
    deadline_->clear();
    if (message.kind == Kind::Data)
        return onData(message);
    if (message.kind != Kind::Request)
        return refuse("Only requests are expected here.");
    ++round_;
    passesDataOver_ = false;
    request_ = Request{message, {}};
    try {
        takeRequest(message.command);
    } catch (std::exception const& e) {
        return refuseRequest(Base::codedLine(e));
    }
    Answer const answer(std::make_shared<Answer::State>(io_, weak_from_this()));
    try {
        context_->handler()(request_->cmd, answer);
    } catch (std::exception const& e) {
        answer.fail(Base::codedLine(e));
    }
}

void Peer::takeRequest(std::uint8_t command) {
    request_->cmd = context_->factory()(command, shared_from_this());
    if (!request_->cmd)
        throw Base::Error(Base::Code::RequestInvalid,
                          "There is no command with the number " + std::to_string(command) + '.');
    request_->cmd->readReq();
    if (!request_->isRead)
        throw Base::Error(Base::Code::RequestInvalid, "This command cannot be received.");
}

void Peer::read(std::shared_ptr<Ipc::CmdI> cmd, Message which,
                std::function<void(json::Object const&)> taken) {
    if (!request_ || cmd != request_->cmd || which != Message::Request || request_->isRead)
        return cmd->onTransferError("There is nothing to be read for it.");
    request_->isRead = true;
    taken(parse(request_->message.text));
}

void Peer::answered(std::optional<std::string> const& failure, Telling telling) {
    if (!request_ || state_ != State::Ready)
        return;
    if (failure)
        return refuseRequest(*failure, telling);
    try {
        request_->cmd->sendResp();
    } catch (std::exception const& e) {
        return refuseRequest(Base::codedLine(e));
    }
    if (!request_->isAnswered)
        refuseRequest("This command cannot be answered.");
}

void Peer::send(std::shared_ptr<Ipc::CmdI> cmd, Message which, json::Object const& message,
                std::function<void()> gone) {
    if (!request_ || cmd != request_->cmd || which != Message::Response || request_->isAnswered)
        return cmd->onTransferError("Nobody has asked for it.");
    Frame const to = request_->message;
    write({to.command, Kind::Response, to.sequence, print(message)}, [this, gone = std::move(gone)] {
        tellGone(gone);
        endRequest();
    });
    request_->isAnswered = true;
}

void Peer::tellGone(std::function<void()> const& gone) const {
    try {
        gone();
    } catch (std::exception const& e) {
        log(FAILED, e.what());
    }
}

void Peer::submit(std::shared_ptr<Ipc::CmdI> cmd) { cmd->onTransferError("A service sends no requests."); }

void Peer::refuseRequest(std::string const& reason, Telling telling) {
    if (telling == Telling::Log)
        log(FAILED, "Request " + std::to_string(request_->message.command) + " failed: " + reason);
    Frame const to = request_->message;
    request_->isAnswered = true;
    write({to.command, Kind::Error, to.sequence, printError(reason)}, [this] { endRequest(); });
}

void Peer::endRequest() {
    request_.reset();
    context_->release(std::exchange(reserved_, 0));
    link_->allow(Link::SMALL);
    if (context_->isStopping())
        close();
    else
        receive();
}

// --- data

void Peer::onData(Frame const& message) {
    if (!context_->dataHandler() || message.command != PACK_DATA)
        return refuse("This service takes no such data.");
    data_ = Data{message.sequence, std::string(message.text)};
    // A small piece, too, counts until it is stored: there may be many of them.
    if (reserved_ > 0)
        takeData();
    else
        context_->reserve(HEADER_SIZE + message.text.size(), shared_from_this());
}

void Peer::takeData() {
    auto [sequence, text] = *std::exchange(data_, std::nullopt);
    std::size_t const size = text.size();
    unstored_ += size;
    DataStored const stored(std::make_shared<DataStored::State>(io_, context_, weak_from_this(), sequence,
                                                                size, round_, std::exchange(reserved_, 0)));
    link_->allow(Link::SMALL);
    if (unstored_ > DATA_WINDOW)
        return refuse("It sends more data at once than it may.");
    try {
        parseData(text);
    } catch (Base::Error const& malformed) {
        return refuse(malformed.what());
    }
    if (!passesDataOver_)
        handOver(std::move(text), stored);
    // Behind what others want.
    asio::post(io_, [self = shared_from_this()] {
        if (self->state_ == State::Ready)
            self->receive();
    });
}

void Peer::handOver(std::string text, DataStored const& stored) {
    try {
        context_->dataHandler()({shared_from_this(), std::move(text)}, stored);
    } catch (std::exception const& e) {
        stored.fail(Base::codedLine(e));
    }
}

void Peer::dataStored(std::uint32_t sequence, std::size_t size, std::uint32_t round,
                      std::optional<std::string> const& failure) {
    unstored_ -= size;
    if (state_ != State::Ready || round != round_ || passesDataOver_)
        return;
    orGiveUp([&] {
        if (!failure)
            return tellStored(sequence);
        log(FAILED, "Its data is refused: " + *failure);
        passesDataOver_ = true;
        write({PACK_DATA, Kind::Error, sequence, printError(*failure)}, [] {});
    });
}

void Peer::tellStored(std::uint32_t sequence) {
    // One word for all that it has not been told yet.
    if (!outgoing_.empty() && outgoing_.back().kind == Kind::Stored)
        outgoing_.back().sequence = sequence;
    else
        write({PACK_DATA, Kind::Stored, sequence, {}}, [] {});
}

// --- writing

void Peer::write(Frame const& message, std::function<void()> gone) {
    if (!isWriting_ && outgoing_.empty())
        return writeNow(message, std::move(gone));
    outgoing_.push_back(
        {message.command, message.kind, message.sequence, std::string(message.text), std::move(gone)});
    writeWaiting();
}

void Peer::writeWaiting() {
    if (outgoing_.empty() || isWriting_ || state_ == State::Closed)
        return;
    Outgoing const next = std::move(outgoing_.front());
    outgoing_.pop_front();
    writeNow({next.command, next.kind, next.sequence, next.text}, next.gone);
}

void Peer::writeNow(Frame const& message, std::function<void()> gone) {
    // Greeting and leaving have a time as a whole.
    if (state_ == State::Ready)
        writeDeadline_->set(context_->settings().messageTime);
    link_->send(message, [self = shared_from_this(), gone = std::move(gone)](error_code const& ec) {
        if (self->state_ == State::Closed)
            return;
        self->context_->holdAnswer(self, 0);
        self->isWriting_ = false;
        if (ec)
            return self->giveUp(ec.message() + '.');
        self->writeDeadline_->clear();
        self->orGiveUp(gone);
        self->orGiveUp([&] { self->writeWaiting(); });
    });
    isWriting_ = true;
    context_->holdAnswer(shared_from_this(), link_->sending());
}

template<typename Step>
void Peer::orGiveUp(Step step) {
    try {
        step();
    } catch (std::exception const& e) {
        giveUp(e.what());
    }
}

// --- the end

void Peer::refuse(std::string const& reason) {
    log(FAILED, reason);
    state_ = State::Leaving;
    setDeadline(context_->settings().greetingTime, "It does not leave.");
    write({GREETING, Kind::Error, 0, printError(reason)},
          [this] { link_->finish([self = shared_from_this()] { self->close(); }); });
}

void Peer::stop() {
    if (!request_)
        close();
}

void Peer::close() {
    if (state_ == State::Closed)
        return;
    state_ = State::Closed;
    auto const self = shared_from_this();
    // The command holds this object as its processor.
    request_.reset();
    deadline_.reset();
    writeDeadline_.reset();
    socket_.reset();
    if (link_)
        link_->close();
    link_.reset();
    context_->release(std::exchange(reserved_, 0));
    context_->holdAnswer(self, 0);
    context_->leave(self);
}

void Peer::setDeadline(std::chrono::milliseconds time, std::string reason) {
    dueReason_ = std::move(reason);
    deadline_->set(time);
}

void Peer::onDue() { giveUp(dueReason_); }

void Peer::makeWay() {
    // No failure: a flood of strangers is not to become one of lines.
    log(TRACE, "It makes way for others before it has proved itself.");
    close();
}

void Peer::giveUp(std::string const& reason) {
    log(FAILED, reason);
    close();
}

void Peer::log(int priority, std::string const& text) const {
    if (priority == TRACE && !g_LogVerbose)
        return;
    if (priority == FAILED && !isKnown_ && !context_->mayTellOfStranger())
        return;
    Log::Lock line(priority);
    line.logStreamLine() << "Channel " << name_ << ": " << text;
}

} // namespace Channel
