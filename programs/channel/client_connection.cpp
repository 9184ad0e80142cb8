#include "programs/channel/client_connection.h"

#include "programs/base/error.h"
#include "programs/base/host_port.h"
#include "programs/channel/data_message.h"
#include "programs/channel/message_text.h"
#include "programs/channel/pin_store.h"
#include "programs/channel/token.h"

#include <boost/asio/connect.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/post.hpp>

#include <algorithm>
#include <limits>
#include <utility>

namespace Channel {

namespace asio = boost::asio;

namespace {

std::string inSeconds(std::chrono::milliseconds time) {
    auto const milliseconds = time.count() % 1000;
    std::string text = std::to_string(time.count() / 1000);
    if (milliseconds != 0)
        text += '.' + std::to_string(1000 + milliseconds).substr(1);
    return text + " s";
}

std::uint32_t nextSequence(std::uint32_t sequence) {
    return sequence == std::numeric_limits<std::uint32_t>::max() ? FIRST_COMMAND : sequence + 1;
}

Deadline::Clock::time_point dueAfter(std::chrono::milliseconds time) {
    return time.count() > 0 ? Deadline::Clock::now() + time : Deadline::NEVER;
}

/// With the code that the service gives.
std::string refusalIn(Frame const& error) {
    return Base::codedLine("The service refuses: " + reasonOf(error.text), Base::Code::ServiceRefused);
}

} // namespace

std::shared_ptr<ClientConnection> ClientConnection::make(asio::io_context& io, ClientSettings settings) {
    std::shared_ptr<ClientConnection> connection(new ClientConnection(io, std::move(settings)));
    std::weak_ptr const weak(connection);
    connection->connectDeadline_.emplace(io, [weak] {
        if (auto const self = weak.lock())
            self->fail("It does not let us in within " + inSeconds(self->settings_.connectTime) + '.');
    });
    connection->deadline_.emplace(io, [weak] {
        if (auto const self = weak.lock())
            self->onDue();
    });
    return connection;
}

ClientConnection::ClientConnection(asio::io_context& io, ClientSettings settings)
    : io_(&io), settings_(std::move(settings)) {}

// --- connecting

void ClientConnection::connect(Done done) {
    connected_ = std::move(done);
    state_ = State::Connecting;
    connectDeadline_->set(dueAfter(settings_.connectTime));
    resolve();
}

void ClientConnection::resolve() {
    error_code ec;
    auto const address = asio::ip::make_address(settings_.host, ec);
    if (!ec)
        return connectTo({tcp::endpoint(address, settings_.port)});
    lookup_.emplace(
        *io_, settings_.lookUp, settings_.host,
        [self = shared_from_this()](std::string const& failure, std::vector<std::string> const& addresses) {
            if (self->state_ == State::Closed)
                return;
            self->orFail([&] { self->onLookedUp(failure, addresses); });
        });
}

void ClientConnection::onLookedUp(std::string const& failure, std::vector<std::string> const& addresses) {
    if (!failure.empty())
        return fail(failure);
    std::vector<tcp::endpoint> endpoints;
    for (std::string const& address : addresses)
        endpoints.emplace_back(asio::ip::make_address(address), settings_.port);
    connectTo(std::move(endpoints));
}

void ClientConnection::connectTo(std::vector<tcp::endpoint> endpoints) {
    socket_.emplace(*io_);
    auto const kept = std::make_shared<std::vector<tcp::endpoint>>(std::move(endpoints));
    asio::async_connect(
        *socket_, *kept, [self = shared_from_this(), kept](error_code const& ec, tcp::endpoint const&) {
            if (self->state_ == State::Closed)
                return;
            if (ec)
                return self->fail("Nobody answers there: " + ec.message() + '.');
            self->orFail([&] { self->onConnected(*std::exchange(self->socket_, std::nullopt)); });
        });
}

void ClientConnection::onConnected(tcp::socket socket) {
    socket.set_option(tcp::no_delay(true));
    socket.set_option(asio::socket_base::keep_alive(true));
    ends_ = endsOf(socket);
    bool const isTls = settings_.tls == Tls::Always || !isLoopback(socket.remote_endpoint().address());
    if (isTls) {
        tls_ = makeClientContext();
        link_ = std::make_shared<Link>(makeTlsStream(std::move(socket), *tls_, TlsRole::Client));
    } else {
        link_ = std::make_shared<Link>(makePlainStream(std::move(socket)));
    }
    link_->speak(version_);
    link_->handshake([self = shared_from_this()](error_code const& ec) {
        if (self->state_ == State::Closed)
            return;
        if (ec)
            return self->fail("TLS failed: " + ec.message() + '.');
        self->orFail([&] { self->onHandshake(); });
    });
}

void ClientConnection::onHandshake() {
    if (tls_) {
        fingerprint_ = link_->fingerprint();
        requirePinned();
    }
    greet();
}

void ClientConnection::requirePinned() const {
    PinStore const pins(settings_.pinFile);
    auto const pinned = pins.find(service());
    if (!pinned && !settings_.acceptNew)
        throw Base::Error(Base::Code::CertificateUntrusted,
                          "Its certificate is new: " + fingerprint_ + ". It must be accepted first.");
    if (pinned && *pinned != fingerprint_)
        throw Base::Error(Base::Code::CertificateUntrusted,
                          "Its certificate has changed from " + *pinned + " to " + fingerprint_ +
                              ". If that is right, remove its line from \"" + settings_.pinFile + "\".");
}

void ClientConnection::greet() {
    greeting_.emplace(terms(), makeNonce());
    link_->limitText(MAX_GREETING);
    link_->allow(HEADER_SIZE + MAX_TEXT + Seal::SIZE);
    auto const challenge = greeting_->challenge();
    write(challenge.frame(), [this] { receive([this](Frame const& message) { onGreeting(message); }); });
}

Terms ClientConnection::terms() const {
    if (tls_)
        return {version_, settings_.token, fingerprint_, {}, {}};
    return {version_, settings_.token, {}, ends_.own, ends_.other};
}

void ClientConnection::onGreeting(Frame const& message) {
    if (link_->heardVersion() < version_)
        return onOldService(message);
    GreetingStep const step = greeting_->take(message);
    switch (step.verdict) {
    case GreetingStep::Verdict::GoesOn:
        return write(step.reply->frame(),
                     [this] { receive([this](Frame const& next) { onGreeting(next); }); });
    case GreetingStep::Verdict::Welcome:
        takesData_ = step.takesData;
        return onWelcome(step.seals);
    case GreetingStep::Verdict::Refused:
        return fail(step.reason);
    }
}

/// It has refused our version, or answers in another one than it was asked in.
void ClientConnection::onOldService(Frame const& message) {
    if (message.kind != Kind::Error)
        return fail("It does not greet.");
    if (!settings_.allowsVersion1)
        return fail("It speaks version 1 of the connection alone, in which others on the way can speak for "
                    "us; bring it up to date, or add --allow-channel-1 to go on with it.");
    version_ = VERSION_1;
    link_->close();
    link_.reset();
    resolve();
}

void ClientConnection::onWelcome(std::optional<SealKeys> const& seals) {
    greeting_.reset();
    if (seals)
        link_->seal(seals->client, seals->service);
    if (tls_)
        pinNew();
    link_->limitText(MAX_TEXT);
    connectDeadline_.reset();
    sequence_ = FIRST_COMMAND;
    state_ = State::Ready;
    if (auto const connected = std::exchange(connected_, nullptr))
        connected({});
    pump();
}

void ClientConnection::pinNew() {
    PinStore const pins(settings_.pinFile);
    if (pins.find(service()))
        return;
    if (!settings_.acceptNew(service(), fingerprint_))
        throw Base::Error(Base::Code::CertificateUntrusted, "Its certificate was not accepted.");
    pins.add(service(), fingerprint_);
}

// --- the queue

void ClientConnection::submit(std::shared_ptr<Ipc::CmdI> cmd, Done done) {
    auto const time = settings_.requestTime(cmd->reqTimeoutId());
    Request request{std::move(cmd), std::move(done), time, dueAfter(time)};
    if (state_ == State::Closed)
        return failRequest(request, failure_);
    deadline_->setNoLaterThan(request.due);
    requests_.push_back(std::move(request));
    pump();
}

void ClientConnection::submitData(Client::DataSource source, Done done) {
    auto const time = settings_.requestTime(Ipc::Timeouts::TIMEOUT_ID_2);
    Request request{nullptr, std::move(done), time, dueAfter(time), std::move(source)};
    if (state_ == State::Closed)
        return failRequest(request, failure_);
    deadline_->setNoLaterThan(request.due);
    requests_.push_back(std::move(request));
    pump();
}

void ClientConnection::sendNext() {
    isHeld_ = false;
    pump();
}

void ClientConnection::pump() {
    while (state_ == State::Ready && !isBusy_ && !isHeld_ && !requests_.empty())
        begin();
}

void ClientConnection::begin() {
    isBusy_ = true;
    isSent_ = false;
    if (requests_.front().source)
        return orFail([&] { beginData(); });
    auto const cmd = requests_.front().cmd;
    try {
        cmd->sendReq();
        if (!isSent_ && state_ == State::Ready)
            endRequest("It was not built for this connection.");
    } catch (std::exception const& e) {
        if (isSent_)
            fail(Base::codedLine(e));
        else
            endRequest(Base::codedLine(e));
    }
}

void ClientConnection::send(std::shared_ptr<Ipc::CmdI> cmd, Message which, json::Object const& message,
                            std::function<void()> gone) {
    if (!isBusy_ || isSent_ || cmd != requests_.front().cmd || which != Message::Request)
        return cmd->onTransferError("It is not its turn.");
    write({cmd->id(), Kind::Request, sequence_, print(message)}, [this, cmd, gone = std::move(gone)] {
        gone();
        cmd->readResp();
        if (!taken_)
            throw Base::Error(Base::Code::Unexpected, "This command cannot take an answer.");
    });
    isSent_ = true;
}

void ClientConnection::read(std::shared_ptr<Ipc::CmdI> cmd, Message which,
                            std::function<void(json::Object const&)> taken) {
    if (!isBusy_ || !isSent_ || taken_ || cmd != requests_.front().cmd || which != Message::Response)
        return cmd->onTransferError("There is nothing to be read for it.");
    taken_ = std::move(taken);
    receive([this](Frame const& message) { takeAnswer(message); });
}

void ClientConnection::takeAnswer(Frame const& message) {
    bool const isAnswer = message.command == requests_.front().cmd->id() && message.sequence == sequence_ &&
                          message.kind != Kind::Request;
    if (!isAnswer && message.kind == Kind::Error)
        throw Base::Error(Base::Code::ConnectionRefused,
                          "It closes the connection: " + reasonOf(message.text));
    if (!isAnswer)
        throw Base::Error(Base::Code::ConnectionBroken, "It answers what was not asked.");
    std::string failure;
    try {
        if (message.kind == Kind::Error)
            failure = refusalIn(message);
        else
            taken_(parse(message.text, MAX_ANSWER_VALUES));
    } catch (std::exception const& e) {
        failure = Base::codedLine(std::string("The answer cannot be used: ") + e.what(),
                                  Base::Code::ConnectionBroken);
    }
    endRequest(failure);
    pump();
}

void ClientConnection::endRequest(std::string const& failure) {
    Request request = std::move(requests_.front());
    requests_.pop_front();
    taken_ = nullptr;
    sequence_ = nextSequence(sequence_);
    isHeld_ = request.cmd && !request.cmd->sendNextReqAfterDone();
    // Still busy, so that what the functions submit waits for its turn.
    if (!failure.empty())
        failRequest(request, failure);
    else if (request.done)
        request.done({});
    isBusy_ = false;
}

void ClientConnection::failRequest(Request& request, std::string const& reason) {
    if (request.cmd)
        request.cmd->onTransferError(reason);
    if (request.done)
        request.done(reason);
}

void ClientConnection::onDue() {
    auto const now = Deadline::Clock::now();
    if (isBusy_ && !requests_.empty() && requests_.front().due <= now)
        return fail("It gives no answer within " + inSeconds(requests_.front().time) + '.');
    std::deque<Request> late;
    auto next = Deadline::NEVER;
    auto const waiting = requests_.begin() + (isBusy_ && !requests_.empty() ? 1 : 0);
    auto const firstLate =
        std::stable_partition(waiting, requests_.end(), [&](Request const& r) { return r.due > now; });
    std::move(firstLate, requests_.end(), std::back_inserter(late));
    requests_.erase(firstLate, requests_.end());
    for (Request const& request : requests_)
        next = std::min(next, request.due);
    deadline_->setNoLaterThan(next);
    for (Request& request : late)
        failRequest(request, "Its turn did not come within " + inSeconds(request.time) + '.');
}

// --- data

void ClientConnection::beginData() {
    if (!takesData_)
        return endRequest("The service takes no data on this connection.");
    upload_.emplace();
    pumpData();
}

/// Goes on as far as it can; the next word of the service's, or the end of a message, brings it here again.
void ClientConnection::pumpData() {
    DataUnderWay& upload = *upload_;
    if (upload.isWriting)
        return;
    if (!upload.isAtEnd && upload.refusal.empty() && upload.bytes + MAX_DATA_TEXT <= DATA_WINDOW) {
        if (auto const text = requests_.front().source())
            return sendPiece(*text);
        upload.isAtEnd = true;
    }
    if (upload.refusal.empty() && !(upload.isAtEnd && upload.messages.empty()))
        return;
    std::string const refusal = upload.refusal;
    upload_.reset();
    endRequest(refusal);
    pump();
}

void ClientConnection::sendPiece(std::string const& text) {
    DataUnderWay& upload = *upload_;
    upload.messages.emplace_back(sequence_, text.size());
    upload.bytes += text.size();
    upload.isWriting = true;
    write({PACK_DATA, Kind::Data, sequence_, text}, [this] {
        upload_->isWriting = false;
        pumpData();
    });
    sequence_ = nextSequence(sequence_);
    if (!upload.isReceiving)
        awaitStored();
}

void ClientConnection::awaitStored() {
    Request& request = requests_.front();
    request.due = dueAfter(request.time);
    deadline_->setNoLaterThan(request.due);
    upload_->isReceiving = true;
    receive([this](Frame const& message) {
        upload_->isReceiving = false;
        onStored(message);
        pumpData();
        if (upload_ && !upload_->isReceiving && !upload_->messages.empty() && upload_->refusal.empty())
            awaitStored();
    });
}

void ClientConnection::onStored(Frame const& message) {
    DataUnderWay& upload = *upload_;
    auto const last = std::find_if(upload.messages.begin(), upload.messages.end(),
                                   [&](auto const& piece) { return piece.first == message.sequence; });
    bool const isOfData = message.command == PACK_DATA && last != upload.messages.end();
    if (isOfData && message.kind == Kind::Stored) {
        for (auto piece = upload.messages.begin(); piece != last + 1; ++piece)
            upload.bytes -= piece->second;
        upload.messages.erase(upload.messages.begin(), last + 1);
    } else if (message.kind != Kind::Error) {
        throw Base::Error(Base::Code::ConnectionBroken, "It answers what was not asked.");
    } else if (isOfData) {
        upload.refusal = refusalIn(message);
    } else {
        throw Base::Error(Base::Code::ConnectionRefused,
                          "It closes the connection: " + reasonOf(message.text));
    }
}

// --- the connection

void ClientConnection::write(Frame const& message, std::function<void()> gone) {
    link_->send(message, [self = shared_from_this(), gone = std::move(gone)](error_code const& ec) {
        if (self->state_ == State::Closed)
            return;
        if (ec)
            return self->fail("The connection broke: " + ec.message() + '.');
        self->orFail(gone);
    });
}

void ClientConnection::receive(std::function<void(Frame const&)> onMessage) {
    link_->receive([self = shared_from_this(), onMessage = std::move(onMessage)](Received const& received) {
        if (self->state_ == State::Closed)
            return;
        if (received.what != Received::What::Message)
            return self->fail(received.reason);
        self->orFail([&] { onMessage(received.message); });
    });
}

template<typename Step>
void ClientConnection::orFail(Step step) {
    try {
        step();
    } catch (std::exception const& e) {
        fail(Base::codedLine(e));
    }
}

void ClientConnection::close() { end("The connection was closed."); }

void ClientConnection::fail(std::string const& reason) { end(service() + ": " + reason); }

void ClientConnection::end(std::string const& reason) {
    if (state_ == State::Closed)
        return;
    auto const self = shared_from_this();
    state_ = State::Closed;
    failure_ = reason;
    connectDeadline_.reset();
    deadline_.reset();
    lookup_.reset();
    socket_.reset();
    if (link_)
        link_->close();
    link_.reset();
    taken_ = nullptr;
    upload_.reset();
    auto const requests = std::exchange(requests_, {});
    if (auto const connected = std::exchange(connected_, nullptr))
        connected(failure_);
    for (Request request : requests)
        failRequest(request, failure_);
}

std::string ClientConnection::service() const { return Base::hostPortText(settings_.host, settings_.port); }

} // namespace Channel
