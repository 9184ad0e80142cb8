// Discovery without a network: its sockets cannot open here, and what would arrive is put into its handlers.

#include "tests/ipc/discovery_access.h"
#include "tests/ipc/failing_syscalls.h"
#include "tests/ipc/recording_processor.h"
#include "tests/support/log_lines.h"

#include "vlservice/ipc/gui_fwd.h"
#include "vlservice/json/json_text.h"

#include <boost/asio/error.hpp>
#include <boost/asio/post.hpp>

#include <gmock/gmock.h>

#include <optional>
#include <sstream>

using namespace testing;
using Access = Ipc::DiscoveryTestAccess;
using Line = VLServiceTest::LogLine;
using boost::posix_time::hours;
using boost::posix_time::seconds;

namespace {

constexpr auto BAD_MESSAGE = "Discovery receive operation failed to deserialize or process the message. ";

/// Does the work on a host without sockets.
template<typename Work>
void withoutSockets(Work work) {
    whileRefused({SYS_socket}, EAFNOSUPPORT, work);
}

class DiscoveryHandlers : public Test {
protected:
    boost::asio::io_context io;
    /// The first of its kind makes the reactor, which needs files.
    boost::asio::deadline_timer reactorMaker{io};
    VLServiceTest::LogLines log;
    std::vector<std::string> received;

    std::unique_ptr<Ipc::DiscoveryBase> makeBase(bool ipv4 = true) {
        std::unique_ptr<Ipc::DiscoveryBase> base;
        withoutSockets([&] { base = std::make_unique<Ipc::DiscoveryBase>(io, ipv4); });
        log.lines.clear();
        return base;
    }

    static std::string textOf(json::Object const& object) {
        std::ostringstream text;
        text << object;
        return text.str();
    }

    Ipc::DiscoveryBase::RcvFunc collect() {
        return [this](json::Object object) { received.push_back(textOf(object)); };
    }

    void TearDown() override { io.poll(); }
};

// --- constants and requests

TEST(DiscoveryConstants, AreThoseOfTheWire) {
    EXPECT_EQ(Ipc::DiscoveryBase::SVC_HOST_FLD_NAME, "host");
    EXPECT_EQ(Ipc::DiscoveryBase::SVC_PORT_FLD_NAME, "port");
    EXPECT_EQ(Ipc::DiscoveryBase::DISCOVERY_PORT, 45677);
    EXPECT_EQ(Ipc::DiscoveryCli::DISCOVERY_TIMEOUT.total_microseconds(), 2'000'000);
}

TEST(DiscoveryRequest, IsOneTrueMember) {
    std::ostringstream text;
    text << Ipc::DiscoveryBase::makeReq();
    EXPECT_EQ(text.str(), R"({"#req":true})");
}

TEST(DiscoveryRequest, IsToldByJsonTrueAlone) {
    std::pair<char const*, bool> const cases[] = {
        {R"({"#req":true})", true},
        {R"({"#req":true,"host":"h"})", true},
        {R"({"#req":false})", false},
        {R"({"#req":1})", false},
        {R"({"#req":"true"})", false},
        {R"({"host":"h"})", false},
        {"{}", false},
    };
    for (auto const& [text, expected] : cases)
        EXPECT_EQ(Ipc::DiscoveryBase::isReq(json::strToObject(text, std::string_view(text).size())), expected)
            << text;
}

TEST_F(DiscoveryHandlers, ReceiveAllGoesOnBehindEveryDatagram) {
    auto const base = makeBase();
    base->recvAll(collect());
    for (char const* datagram : {R"({"a":1})", "no JSON", R"({"b":2})"})
        Access::receive(*base, datagram);
    EXPECT_THAT(received, ElementsAre(R"({"a":1})", R"({"b":2})"));
    base->close();
    Access::receive(*base, R"({"c":3})");
    EXPECT_THAT(received, SizeIs(2));
}

TEST_F(DiscoveryHandlers, ReceiveAllEndsWithTheObjectThatItsFunctionDestroys) {
    auto base = makeBase();
    base->recvAll([&](json::Object const&) { base.reset(); });
    Access::receive(*base, "{}");
    EXPECT_FALSE(base);
}

// --- opening

TEST_F(DiscoveryHandlers, ASocketThatDoesNotOpenIsLoggedForIp4) {
    withoutSockets([&] { EXPECT_FALSE(Ipc::DiscoveryBase(io, true).isOpen()); });
    EXPECT_THAT(log.lines,
                ElementsAre(Line{
                    3, "Discovery failed to initialize. open: Address family not supported by protocol"}));
}

TEST_F(DiscoveryHandlers, ASocketThatDoesNotOpenIsPassedOverForIp6) {
    withoutSockets([&] { EXPECT_FALSE(Ipc::DiscoveryBase(io, false).isOpen()); });
    EXPECT_THAT(log.lines, IsEmpty());
}

TEST_F(DiscoveryHandlers, ASocketThatDoesNotOpenIsATraceLineForIp6) {
    g_LogVerbose = true;
    withoutSockets([&] { EXPECT_FALSE(Ipc::DiscoveryBase(io, false).isOpen()); });
    EXPECT_THAT(
        log.lines,
        ElementsAre(
            Line{7, "Discovery failed to open IPv6 socket. open: Address family not supported by protocol"}));
}

TEST_F(DiscoveryHandlers, ASocketThatNeverOpenedFailsInItsHandlers) {
    auto const base = makeBase();
    base->recv(collect());
    base->send(Ipc::DiscoveryBase::makeReq());
    EXPECT_THAT(log.lines, IsEmpty());
    io.run();
    EXPECT_THAT(log.lines, ElementsAre(Line{4, "Discovery receive operation failed. Bad file descriptor"},
                                       Line{4, "Discovery send operation failed. Bad file descriptor"}));
    EXPECT_THAT(received, IsEmpty());
}

TEST_F(DiscoveryHandlers, WithoutAReactorThereIsNoSocketAndTheHandlersFailTheSame) {
    boost::asio::io_context bare;
    std::optional<Ipc::DiscoveryBase> base;
    whileRefused({SYS_epoll_create1}, EMFILE, [&] { base.emplace(bare, true); });
    EXPECT_FALSE(base->isOpen());
    EXPECT_THAT(log.lines,
                ElementsAre(Line{3, "Discovery failed to initialize. epoll: Too many open files"}));
    log.lines.clear();
    base->recv(collect());
    base->send(Ipc::DiscoveryBase::makeReq());
    bare.run();
    EXPECT_THAT(log.lines, ElementsAre(Line{4, "Discovery receive operation failed. Bad file descriptor"},
                                       Line{4, "Discovery send operation failed. Bad file descriptor"}));
    base->close();
}

// --- receiving

TEST_F(DiscoveryHandlers, ADatagramReachesTheFunction) {
    auto const base = makeBase();
    base->recv(collect());
    Access::receive(*base, R"({"host":"h","port":1})");
    EXPECT_THAT(received, ElementsAre(R"({"host":"h","port":1})"));
    EXPECT_THAT(log.lines, IsEmpty());
}

TEST_F(DiscoveryHandlers, TheLastFunctionReceives) {
    auto const base = makeBase();
    base->recv([](json::Object) { FAIL() << "this one was replaced"; });
    base->recv(collect());
    Access::receive(*base, "{}");
    EXPECT_THAT(received, ElementsAre("{}"));
}

struct BadDatagram {
    char const* name;
    std::string datagram;
    char const* reason;
};

class DiscoveryRefusing : public DiscoveryHandlers, public WithParamInterface<BadDatagram> {};

TEST_P(DiscoveryRefusing, LogsAndDropsIt) {
    auto const base = makeBase();
    base->recv(collect());
    Access::receive(*base, GetParam().datagram);
    EXPECT_THAT(received, IsEmpty());
    ASSERT_EQ(log.lines.size(), 1u);
    EXPECT_EQ(log.lines[0].priority, 3);
    EXPECT_THAT(log.lines[0].text, StartsWith(std::string(BAD_MESSAGE) + GetParam().reason));
}

INSTANTIATE_TEST_SUITE_P(
    Datagrams, DiscoveryRefusing,
    Values(BadDatagram{"Nothing", "", "JSON error: '[' or '{' expected near end of file"},
           BadDatagram{"Garbage", std::string("\x01\x00\xff", 3), "JSON error: "},
           BadDatagram{"AnArray", "[1]", "JSON error: Wrong type: array. Expected type: object"},
           BadDatagram{"ATextCutAtTheEndOfTheBuffer", R"({"host":")" + std::string(1100, 'h') + "\"}",
                       "JSON error: "},
           BadDatagram{"TwoObjects", "{}{}", "JSON error: end of file expected near '{'"},
           BadDatagram{"TextThatIsNotUtf8", "{\"host\":\"\xc3\x28\"}",
                       "JSON error: unable to decode byte 0xc3"}),
    [](auto const& instance) { return instance.param.name; });

TEST_F(DiscoveryHandlers, AnObjectOfTheGreatestLengthArrives) {
    auto const base = makeBase();
    base->recv(collect());
    std::string const longest = R"({"host":")" + std::string(1024 - 11, 'h') + "\"}";
    ASSERT_EQ(longest.size(), 1024u);
    Access::receive(*base, longest);
    EXPECT_THAT(received, ElementsAre(longest));
}

TEST_F(DiscoveryHandlers, WhatTheFunctionThrowsIsLogged) {
    auto const base = makeBase();
    base->recv([](json::Object) { throw std::runtime_error("no room"); });
    Access::receive(*base, "{}");
    EXPECT_THAT(log.lines, ElementsAre(Line{3, std::string(BAD_MESSAGE) + "no room"}));
}

TEST_F(DiscoveryHandlers, AFailedReceiveIsLoggedAndNoneFollows) {
    auto const base = makeBase();
    base->recv(collect());
    Access::failReceive(*base, boost::asio::error::operation_aborted);
    EXPECT_THAT(log.lines, ElementsAre(Line{4, "Discovery receive operation failed. Operation canceled"}));
    EXPECT_THAT(received, IsEmpty());
}

TEST_F(DiscoveryHandlers, AFunctionMayReceiveAgain) {
    auto const base = makeBase();
    base->recv([&](json::Object object) {
        std::string const guard(200, 'x');
        base->recv(collect());
        // What this function holds is still there after it was replaced.
        received.push_back("first " + textOf(object) + guard);
    });
    Access::receive(*base, "{}");
    Access::receive(*base, R"({"n":2})");
    EXPECT_THAT(received, ElementsAre("first {}" + std::string(200, 'x'), R"({"n":2})"));
}

TEST_F(DiscoveryHandlers, AFunctionMayDestroyItsBase) {
    auto base = makeBase();
    base->recv([&](json::Object) { base.reset(); });
    Access::receive(*base, "{}");
    EXPECT_EQ(base, nullptr);
    EXPECT_THAT(log.lines, IsEmpty());
}

TEST_F(DiscoveryHandlers, NothingIsHandledAfterDestruction) {
    auto base = makeBase();
    base->recv(collect(), seconds(0));
    base->send(Ipc::DiscoveryBase::makeReq());
    base.reset();
    io.run();
    EXPECT_THAT(received, IsEmpty());
    EXPECT_THAT(log.lines, IsEmpty());
}

// --- receiving for as long as a service listens

TEST_F(DiscoveryHandlers, ReceivingAllGoesOnAfterGarbageAndAfterWhatTheFunctionThrows) {
    auto const base = makeBase();
    base->recvAll([&](json::Object object) {
        received.push_back(textOf(object));
        if (received.size() == 1)
            throw std::runtime_error("no room");
    });
    for (char const* const datagram : {R"({"n":1})", "garbage", R"({"n":2})"})
        Access::receive(*base, datagram);
    EXPECT_THAT(received, ElementsAre(R"({"n":1})", R"({"n":2})"));
    ASSERT_EQ(log.lines.size(), 2u);
    EXPECT_EQ(log.lines[0], (Line{3, std::string(BAD_MESSAGE) + "no room"}));
    EXPECT_THAT(log.lines[1].text, StartsWith(std::string(BAD_MESSAGE) + "JSON error: "));
}

TEST_F(DiscoveryHandlers, ReceivingAllLogsAFloodOfGarbageInAFewLines) {
    auto const base = makeBase();
    base->recvAll(collect());
    for (int i = 0; i < 10'000; ++i)
        Access::receive(*base, "garbage");
    EXPECT_EQ(log.lines.size(), 10u);
    Access::receive(*base, "{}");
    EXPECT_THAT(received, ElementsAre("{}"));
}

TEST_F(DiscoveryHandlers, ReceivingOneLogsEachDatagramThatIsDropped) {
    auto const base = makeBase();
    for (int i = 0; i < 20; ++i) {
        base->recv(collect());
        Access::receive(*base, "garbage");
    }
    EXPECT_EQ(log.lines.size(), 20u);
}

TEST_F(DiscoveryHandlers, ReceivingAllStartsAReceiveForEachDatagramUntilItIsClosed) {
    auto const base = makeBase();
    Line const failed{4, "Discovery receive operation failed. Bad file descriptor"};
    base->recvAll(collect());
    io.run();
    io.restart();
    EXPECT_THAT(log.lines, ElementsAre(failed));
    Access::receive(*base, "{}");
    io.run();
    io.restart();
    EXPECT_THAT(log.lines, ElementsAre(failed, failed));
    base->close();
    Access::receive(*base, "{}");
    EXPECT_EQ(io.run(), 0u);
    EXPECT_THAT(received, ElementsAre("{}"));
}

TEST_F(DiscoveryHandlers, AFunctionThatReceivesAllMayDestroyItsBase) {
    auto base = makeBase();
    base->recvAll([&](json::Object) { base.reset(); });
    Access::receive(*base, "{}");
    EXPECT_EQ(base, nullptr);
}

// --- time

TEST_F(DiscoveryHandlers, ATimeoutIsAnEmptyObject) {
    auto const base = makeBase();
    base->recv(collect(), seconds(0));
    io.run();
    EXPECT_THAT(received, ElementsAre("{}"));
}

TEST_F(DiscoveryHandlers, ATimeGoesOnAfterADatagram) {
    auto const base = makeBase();
    base->recv(collect(), seconds(0));
    Access::receive(*base, R"({"n":1})");
    io.run();
    EXPECT_THAT(received, ElementsAre(R"({"n":1})", "{}"));
}

TEST_F(DiscoveryHandlers, ATimerThatExpiredBeforeItWasReplacedIsNotHeard) {
    auto const base = makeBase();
    base->recv([](json::Object) { FAIL() << "this one was replaced"; }, seconds(0));
    // The reactor queues the expired timer behind this, so that it comes too late to cancel it.
    boost::asio::post(io, [&] { base->recv(collect(), hours(1)); });
    io.poll();
    EXPECT_THAT(received, IsEmpty());
    base->close();
}

TEST_F(DiscoveryHandlers, ACancelledTimerIsSilent) {
    g_LogVerbose = true;
    auto const base = makeBase();
    base->recv(collect());
    Access::finishWait(*base, boost::asio::error::operation_aborted);
    EXPECT_THAT(received, IsEmpty());
    EXPECT_THAT(log.lines, IsEmpty());
}

TEST_F(DiscoveryHandlers, AFunctionMayDestroyItsBaseAtTheTimeout) {
    auto base = makeBase();
    base->recv([&](json::Object) { base.reset(); }, seconds(0));
    io.run();
    EXPECT_EQ(base, nullptr);
}

// --- sending

TEST_F(DiscoveryHandlers, AFailedSendIsLogged) {
    auto const base = makeBase();
    Access::finishSend(*base, boost::asio::error::network_unreachable);
    EXPECT_THAT(log.lines, ElementsAre(Line{4, "Discovery send operation failed. Network is unreachable"}));
}

TEST_F(DiscoveryHandlers, AFinishedSendIsNotLogged) {
    auto const base = makeBase();
    Access::finishSend(*base, {});
    EXPECT_THAT(log.lines, IsEmpty());
}

// --- closing

TEST_F(DiscoveryHandlers, AfterCloseNothingIsSentReceivedOrLogged) {
    auto const base = makeBase();
    base->close();
    base->recv(collect());
    base->recv(collect(), seconds(0));
    base->send(Ipc::DiscoveryBase::makeReq());
    EXPECT_EQ(io.run(), 0u);
    Access::receive(*base, "{}");
    Access::failReceive(*base, boost::asio::error::operation_aborted);
    Access::finishSend(*base, boost::asio::error::operation_aborted);
    Access::finishWait(*base, {});
    EXPECT_THAT(received, IsEmpty());
    EXPECT_THAT(log.lines, IsEmpty());
}

TEST_F(DiscoveryHandlers, CloseEndsATimedReceiveSilently) {
    auto const base = makeBase();
    base->recv(collect(), hours(1));
    base->close();
    io.run();
    EXPECT_THAT(received, IsEmpty());
    EXPECT_THAT(log.lines, IsEmpty());
}

TEST_F(DiscoveryHandlers, ASecondCloseDoesNothing) {
    auto const base = makeBase();
    base->close();
    base->close();
    EXPECT_FALSE(base->isOpen());
}

// --- trace lines

TEST_F(DiscoveryHandlers, TraceLinesNameTheSender) {
    auto const base = makeBase();
    g_LogVerbose = true;
    base->recv(collect());
    base->send(Ipc::DiscoveryBase::makeReq());
    Access::receive(*base, R"({"host":"h"})");
    Access::finishWait(*base, {});
    EXPECT_THAT(log.lines, ElementsAre(Line{7, R"(Discovery 0.0.0.0 sending msg: {"#req":true})"},
                                       Line{7, R"(Discovery 0.0.0.0 recevied msg: {"host":"h"})"},
                                       Line{7, "Discovery 0.0.0.0 timed out"}));
}

// --- the client

class DiscoveryClient : public DiscoveryHandlers {
protected:
    std::shared_ptr<RecordingProcessor> processor = std::make_shared<RecordingProcessor>();
    std::unique_ptr<Ipc::DiscoveryCli> client;

    void TearDown() override {
        DiscoveryHandlers::TearDown();
        // The commands hold their processor, and here it holds them.
        processor->submitted.clear();
    }

    void start(std::shared_ptr<Ipc::CmdProcessorI> with) {
        withoutSockets([&] { client = std::make_unique<Ipc::DiscoveryCli>(std::move(with), io); });
        io.poll();
        log.lines.clear();
    }
    void start() { start(processor); }

    std::vector<std::string> results() const {
        std::vector<std::string> texts;
        for (auto const& cmd : processor->submitted)
            texts.push_back(textOf(dynamic_cast<Ipc::GuiFwd&>(*cmd).params()));
        return texts;
    }
};

TEST_F(DiscoveryClient, SendsNothingFromItsConstructor) {
    withoutSockets([&] { client = std::make_unique<Ipc::DiscoveryCli>(processor, io); });
    EXPECT_THAT(log.lines,
                ElementsAre(Line{
                    3, "Discovery failed to initialize. open: Address family not supported by protocol"}));
    EXPECT_EQ(Access::timersStarted(Access::v6(*client)), 0u);
}

TEST_F(DiscoveryClient, ReceivesAndSendsOnBothFamiliesThoughNeitherIsOpen) {
    withoutSockets([&] { client = std::make_unique<Ipc::DiscoveryCli>(processor, io); });
    log.lines.clear();
    io.poll();
    Line const noReceive{4, "Discovery receive operation failed. Bad file descriptor"};
    Line const noSend{4, "Discovery send operation failed. Bad file descriptor"};
    EXPECT_THAT(log.lines, ElementsAre(noReceive, noSend, noReceive, noSend));
    EXPECT_EQ(Access::timersStarted(Access::v6(*client)), 1u);
    EXPECT_EQ(Access::timersStarted(Access::v4(*client)), 1u);
    EXPECT_THAT(results(), IsEmpty());
}

TEST_F(DiscoveryClient, HandsOverTheFirstAnswerWithItsProcessor) {
    start();
    Access::receive(Access::v4(*client), R"({"host":"h","port":7})");
    EXPECT_THAT(results(), ElementsAre(R"({"host":"h","port":7})"));
    EXPECT_EQ(processor->submitted[0]->processor(), processor);
    EXPECT_EQ(io.run(), 2u) << "only the two cancelled timers are left";
}

TEST_F(DiscoveryClient, DropsASecondAnswer) {
    start();
    Access::receive(Access::v6(*client), R"({"n":1})");
    Access::receive(Access::v4(*client), R"({"n":2})");
    Access::receive(Access::v6(*client), R"({"n":3})");
    Access::finishWait(Access::v6(*client), {});
    EXPECT_THAT(results(), ElementsAre(R"({"n":1})"));
    EXPECT_THAT(log.lines, IsEmpty());
}

TEST_F(DiscoveryClient, SkipsRequestsAndStartsItsTimeAgain) {
    start();
    Access::receive(Access::v4(*client), R"({"#req":true})");
    EXPECT_THAT(results(), IsEmpty());
    EXPECT_EQ(Access::timersStarted(Access::v4(*client)), 2u);
    EXPECT_EQ(Access::timersStarted(Access::v6(*client)), 1u);
    Access::receive(Access::v4(*client), R"({"host":"h"})");
    EXPECT_THAT(results(), ElementsAre(R"({"host":"h"})"));
}

TEST_F(DiscoveryClient, TakesWhateverIsNoRequestAsAnAnswer) {
    for (char const* const answer : {R"({"#req":false})", R"({"#req":1})", R"({"host":5})", "{}"}) {
        processor->submitted.clear();
        start();
        Access::receive(Access::v6(*client), answer);
        EXPECT_THAT(results(), ElementsAre(answer));
    }
}

TEST_F(DiscoveryClient, EndsWithAnEmptyObjectWhenTheTimeIsUp) {
    start();
    Access::finishWait(Access::v6(*client), {});
    Access::finishWait(Access::v4(*client), {});
    EXPECT_THAT(results(), ElementsAre("{}"));
}

TEST_F(DiscoveryClient, GoesOnWaitingAfterGarbage) {
    start();
    Access::receive(Access::v4(*client), "garbage");
    EXPECT_THAT(results(), IsEmpty());
    Access::finishWait(Access::v4(*client), {});
    EXPECT_THAT(results(), ElementsAre("{}"));
}

/// Destroys the client while it takes the command.
class DestroyingProcessor : public RecordingProcessor {
public:
    std::unique_ptr<Ipc::DiscoveryCli>* client = nullptr;
    void submit(std::shared_ptr<Ipc::CmdI> cmd) override {
        client->reset();
        RecordingProcessor::submit(std::move(cmd));
    }
};

TEST_F(DiscoveryClient, MayBeDestroyedByTheProcessorWithAnAnswer) {
    auto const destroyer = std::make_shared<DestroyingProcessor>();
    processor = destroyer;
    destroyer->client = &client;
    start();
    Access::receive(Access::v4(*client), R"({"host":"h"})");
    EXPECT_EQ(client, nullptr);
    EXPECT_THAT(results(), ElementsAre(R"({"host":"h"})"));
}

TEST_F(DiscoveryClient, MayBeDestroyedByTheProcessorAtTheTimeout) {
    auto const destroyer = std::make_shared<DestroyingProcessor>();
    processor = destroyer;
    destroyer->client = &client;
    start();
    Access::finishWait(Access::v6(*client), {});
    EXPECT_EQ(client, nullptr);
    EXPECT_THAT(results(), ElementsAre("{}"));
}

TEST_F(DiscoveryClient, LetsGoOfItsProcessorWithTheCommand) {
    start();
    Access::receive(Access::v4(*client), "{}");
    processor->submitted.clear();
    EXPECT_EQ(processor.use_count(), 1);
}

TEST_F(DiscoveryClient, HandsNothingOverWhenItIsDestroyedBeforeItBegan) {
    withoutSockets([&] { client = std::make_unique<Ipc::DiscoveryCli>(processor, io); });
    client.reset();
    log.lines.clear();
    io.run();
    EXPECT_THAT(results(), IsEmpty());
    EXPECT_THAT(log.lines, IsEmpty());
}

TEST_F(DiscoveryClient, HandsNothingOverWhenItIsDestroyedWhileItSearches) {
    start();
    client.reset();
    io.run();
    EXPECT_THAT(results(), IsEmpty());
    EXPECT_THAT(log.lines, IsEmpty());
}

} // namespace
