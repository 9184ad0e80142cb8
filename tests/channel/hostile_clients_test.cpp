// What a service does with clients that are broken, hostile, slow or many.

#include "tests/channel/running_server.h"
#include "tests/support/coded_lines.h"

#include "programs/base/error.h"
#include "programs/channel/greeting.h"
#include "programs/channel/message_text.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <stdexcept>
#include <thread>

using namespace testing;
using namespace ChannelTest;
using namespace std::chrono_literals;
using namespace std::string_literals;
using Channel::Client;
using Channel::Kind;

namespace {

class HostileClients : public Test {
protected:
    SharedLog log;
    std::optional<RunningServer> server;

    void serve(Channel::ServerSettings const& settings = patient(), Channel::Server::Handler handler = {}) {
        server.emplace(settings, std::move(handler));
    }

    /// That a well-behaved client gets its answer.
    void expectService() {
        Client client(server->clientSettings());
        client.call<Ipc::PriceEst>(json::Object{});
    }
};

// --- bad bytes

struct BadBeginning {
    char const* name;
    std::string bytes;
    std::string reason;
};

class BadBeginnings : public HostileClients, public WithParamInterface<BadBeginning> {};

TEST_P(BadBeginnings, AreToldLoggedAndClosed) {
    serve();
    Client other(server->clientSettings());
    {
        RawPeer peer(server->port());
        peer.send(GetParam().bytes);
        EXPECT_EQ(wordsOf(peer.refusal()), GetParam().reason);
    }
    EXPECT_TRUE(log.hasLogged(": " + GetParam().reason));
    // Who was there before does not notice.
    other.call<Ipc::PriceEst>(json::Object{});
    EXPECT_TRUE(server->hasConnections(1));
}

std::string greetingOf(int command, Kind kind, std::uint32_t sequence, std::string const& text) {
    return Channel::preface() + bytesOf(command, kind, sequence, text);
}

INSTANTIATE_TEST_SUITE_P(
    Bytes, BadBeginnings,
    Values(BadBeginning{"OtherMagic", "GET / HTTP/1.1\r\n",
                        "The first bytes are not those of this protocol."},
           BadBeginning{"OtherVersion", "VLCH\0\7"s,
                        "Version 7 of the protocol is not spoken here, only the versions 1 and 2."},
           BadBeginning{"UnknownKind", "VLCH\0\1\0\x9\0\0\0\0\0\0\0\0"s, "There is no message of kind 9."},
           BadBeginning{"GreatLength", "VLCH\0\1\0\1\0\0\0\0\xff\xff\xff\xff"s,
                        "A message of 4294967295 bytes is over the limit of 1024."},
           BadBeginning{"LengthForThoseWhoHaveGreeted", "VLCH\0\1\0\1\0\0\0\0\0\0\4\1"s,
                        "A message of 1025 bytes is over the limit of 1024."},
           BadBeginning{"CommandAtOnce", greetingOf(PRICE, Kind::Request, 0, "{}"), NO_GREETING},
           BadBeginning{"ResponseAtOnce", greetingOf(0, Kind::Response, 0, R"({"nonce":"n"})"), NO_GREETING},
           BadBeginning{"SecondStepAtOnce", greetingOf(0, Kind::Request, 1, R"({"proof":"p"})"), NO_GREETING},
           BadBeginning{"NoNonce", greetingOf(0, Kind::Request, 0, "{}"),
                        "JSON error: Wrong type: empty. Expected type: string"},
           BadBeginning{"NoObject", greetingOf(0, Kind::Request, 0, "[]"),
                        "JSON error: Wrong type: array. Expected type: object"}),
    [](auto const& instance) { return instance.param.name; });

TEST_F(HostileClients, ThatAreManyFillNoLog) {
    auto settings = patient();
    settings.strangersLines = 3;
    settings.strangersLinesTime = 1h;
    serve(settings);
    for (int i = 0; i < 10; ++i) {
        RawPeer peer(server->port());
        peer.send("GET / HTTP/1.1\r\n");
        EXPECT_NE(peer.refusal(), "");
    }
    EXPECT_EQ(log.lines().size(), 3u);
    expectService();
}

TEST_F(HostileClients, ThatWereLeftOutOfTheLogAreCountedLater) {
    auto settings = patient();
    settings.strangersLines = 1;
    settings.strangersLinesTime = 100ms;
    serve(settings);
    auto const isCounted = [this] {
        auto const lines = log.lines();
        return std::ranges::any_of(lines, [](std::string const& line) {
            return line.starts_with("Channel: of strangers there were ") && line.ends_with(" more lines.");
        });
    };
    for (auto const end = std::chrono::steady_clock::now() + 1min;
         !isCounted() && std::chrono::steady_clock::now() < end;) {
        RawPeer peer(server->port());
        peer.send("GET / HTTP/1.1\r\n");
        EXPECT_NE(peer.refusal(), "");
    }
    EXPECT_TRUE(isCounted());
}

TEST_F(HostileClients, WithAWrongProofAreToldLoggedAndClosed) {
    serve();
    RawPeer peer(server->port());
    peer.send(greetingOf(0, Kind::Request, 0, R"({"nonce":"n"})"));
    ASSERT_TRUE(peer.receive());
    peer.send(0, Kind::Request, 1, R"({"proof":"0123"})");
    EXPECT_EQ(peer.refusal(), "Its access token is not the one of this service.");
    EXPECT_TRUE(log.hasLogged("Its access token is not the one of this service."));
}

TEST_F(HostileClients, MaySendTheServicesProofBackInVain) {
    serve();
    RawPeer peer(server->port());
    peer.send(greetingOf(0, Kind::Request, 0, R"({"nonce":"n"})"));
    json::Object const answer = Channel::parse(peer.receive().value().text);
    peer.send(0, Kind::Request, 1, Channel::print({{"proof", answer.get("proof")}}));
    EXPECT_EQ(peer.refusal(), "Its access token is not the one of this service.");
}

struct BadMessage {
    char const* name;
    std::string bytes;
    std::string reason;
};

class BadMessages : public HostileClients, public WithParamInterface<BadMessage> {};

TEST_P(BadMessages, EndTheConnection) {
    serve();
    RawPeer peer(server->port());
    peer.greet();
    peer.send(GetParam().bytes);
    EXPECT_EQ(peer.refusal(), GetParam().reason);
    EXPECT_TRUE(log.hasLogged(": " + GetParam().reason));
    expectService();
}

INSTANTIATE_TEST_SUITE_P(
    Bytes, BadMessages,
    Values(BadMessage{"UnknownKind", "\x18\4\0\0\0\2\0\0\0\0"s, "There is no message of kind 4."},
           BadMessage{"GreatLength", "\x18\1\0\0\0\2\1\0\0\1"s,
                      "A message of 16777217 bytes is over the limit of 16777216."},
           BadMessage{"Response", bytesOf(PRICE, Kind::Response, 2, "{}"),
                      "Only requests are expected here."},
           BadMessage{"Error", bytesOf(PRICE, Kind::Error, 2, "{}"), "Only requests are expected here."}),
    [](auto const& instance) { return instance.param.name; });

struct BadRequest {
    char const* name;
    int command;
    std::string text;
    std::string reason;
};

class BadRequests : public HostileClients, public WithParamInterface<BadRequest> {};

TEST_P(BadRequests, AreToldAndLoggedAndTheConnectionGoesOn) {
    serve();
    RawPeer peer(server->port());
    peer.greet();
    peer.send(GetParam().command, Kind::Request, 77, GetParam().text);
    auto const error = peer.receive();
    ASSERT_TRUE(error);
    EXPECT_EQ(error->kind, Kind::Error);
    EXPECT_EQ(error->command, GetParam().command);
    EXPECT_EQ(error->sequence, 77u);
    EXPECT_EQ(wordsOf(Channel::reasonOf(error->text)), GetParam().reason);
    EXPECT_TRUE(
        log.hasLogged("Request " + std::to_string(GetParam().command) + " failed: " + GetParam().reason));
    peer.send(PRICE, Kind::Request, 78, "{}");
    EXPECT_EQ(peer.receive().value().text, R"({"asked":{}})");
}

INSTANTIATE_TEST_SUITE_P(
    Requests, BadRequests,
    Values(BadRequest{"UnknownCommand", 99, "{}", "There is no command with the number 99."},
           BadRequest{"GreetingAgain", 0, "{}", "There is no command with the number 0."},
           BadRequest{"CommandThatNeverTravels", 28, "{}", "There is no command with the number 28."},
           BadRequest{"NoText", PRICE, "",
                      "JSON error: '[' or '{' expected near end of file (line 1, column 0)"},
           BadRequest{"NoJson", PRICE, "{",
                      "JSON error: string or '}' expected near end of file (line 1, column 1)"},
           BadRequest{"NoObject", PRICE, "[]", "JSON error: Wrong type: array. Expected type: object"},
           BadRequest{"TooDeep", PRICE, "{\"a\":" + std::string(3000, '[') + std::string(3000, ']') + "}",
                      "JSON error: maximum parsing depth reached near '[' (line 1, column 2053)"},
           BadRequest{"BodyThatTheCommandRefuses", 25, R"({"db_conn":1})",
                      "JSON error: Wrong type: integer. Expected type: string"}),
    [](auto const& instance) { return instance.param.name; });

TEST_F(HostileClients, ThatBreakOffAnywhereAreLoggedAndHurtNobody) {
    serve();
    std::string const request = bytesOf(PRICE, Kind::Request, 2, R"({"sheets":3})");
    for (std::size_t length = 1; length < request.size(); ++length) {
        RawPeer peer(server->port());
        peer.greet();
        peer.send(request.substr(0, length));
        peer.finish();
        EXPECT_EQ(peer.refusal(), "The connection ended in the middle of a message.") << length;
    }
    EXPECT_EQ(log.lines().size(), request.size() - 1);
    EXPECT_TRUE(server->hasConnections(0));
    expectService();
}

TEST_F(HostileClients, ThatBreakOffInTheGreetingAreLoggedAndHurtNobody) {
    serve();
    std::string const greeting = greetingOf(0, Kind::Request, 0, R"({"nonce":"n"})");
    for (std::size_t length = 1; length < greeting.size(); ++length) {
        RawPeer peer(server->port());
        peer.send(greeting.substr(0, length));
        peer.finish();
        std::string const expected = length == Channel::PREFACE_SIZE
                                         ? "closed without a word"
                                         : "The connection ended in the middle of a message.";
        EXPECT_EQ(peer.refusal(), expected) << length;
    }
    EXPECT_TRUE(server->hasConnections(0));
}

TEST_F(HostileClients, ThatVanishAreForgotten) {
    serve();
    {
        RawPeer peer(server->port());
        peer.greet();
        peer.send("\x18\1\0"s);
        peer.vanish();
    }
    EXPECT_TRUE(log.hasLogged("Connection reset by peer."));
    EXPECT_TRUE(server->hasConnections(0));
}

// --- slow ones

TEST_F(HostileClients, ThatDoNotGreetAreClosed) {
    Channel::ServerSettings settings;
    settings.greetingTime = 50ms;
    serve(settings);
    RawPeer silent(server->port());
    RawPeer halfway(server->port());
    halfway.send(greetingOf(0, Kind::Request, 0, R"({"nonce":"n"})"));
    EXPECT_TRUE(silent.isClosed());
    EXPECT_TRUE(log.hasLogged("It does not greet."));
    while (halfway.receive()) {
    }
    EXPECT_TRUE(server->hasConnections(0));
}

TEST_F(HostileClients, ThatDoNotGoOnWithAMessageAreClosedAndOthersMayBeSilentForLonger) {
    Channel::ServerSettings settings = patient();
    settings.messageTime = 50ms;
    serve(settings);
    RawPeer other(server->port());
    other.greet();
    for (int i = 0; i < 3; ++i) {
        RawPeer peer(server->port());
        peer.greet();
        peer.send(bytesOf(PRICE, Kind::Request, 2, R"({"sheets":3})").substr(0, 12));
        EXPECT_TRUE(peer.isClosed());
    }
    EXPECT_TRUE(log.hasLogged("The rest of its message does not come."));
    other.send(PRICE, Kind::Request, 2, "{}");
    EXPECT_TRUE(other.receive());
}

TEST_F(HostileClients, ThatStopReadingAreClosedAndHoldUpNobody) {
    Channel::ServerSettings settings = patient();
    settings.messageTime = 300ms;
    serve(settings, [](std::shared_ptr<Ipc::CmdI> const& cmd, Channel::Answer const& answer) {
        // Far more than the sockets keep on the way.
        if (auto* const remove = dynamic_cast<Ipc::RemoveCfgNode*>(cmd.get()))
            remove->setResp(std::string(15 * 1024 * 1024, 'x'));
        answer();
    });
    RawPeer peer(server->port());
    peer.greet();
    peer.send(Ipc::RemoveCfgNode::CMD_ID, Kind::Request, 2, "{}");
    expectService();
    EXPECT_TRUE(log.hasLogged("It does not take its answer."));
    EXPECT_TRUE(server->hasConnections(0));
}

// --- many

TEST_F(HostileClients, MayBeAThousand) {
    serve();
    std::vector<std::unique_ptr<RawPeer>> peers;
    for (int i = 0; i < 1000; ++i) {
        peers.push_back(std::make_unique<RawPeer>(server->port()));
        peers.back()->greet();
    }
    EXPECT_EQ(server->connections(), 1000u);
    for (auto const& peer : peers)
        peer->send(PRICE, Kind::Request, 2, "{}");
    for (auto const& peer : peers)
        EXPECT_EQ(peer->receive().value().text, R"({"asked":{}})");
    expectService();
    peers.clear();
    EXPECT_TRUE(server->hasConnections(0));
    EXPECT_THAT(log.lines(), IsEmpty());
}

TEST_F(HostileClients, OverTheLimitWaitUntilOneLeaves) {
    Channel::ServerSettings settings = patient();
    settings.maxConnections = 2;
    serve(settings);
    auto first = std::make_optional<RawPeer>(server->port());
    first->greet();
    RawPeer second(server->port());
    second.greet();
    RawPeer third(server->port());
    third.send(greetingOf(0, Kind::Request, 0, R"({"nonce":"n"})"));
    EXPECT_EQ(server->connections(), 2u);
    first.reset();
    EXPECT_TRUE(third.receive());
    EXPECT_EQ(server->connections(), 2u);
}

TEST_F(HostileClients, ShareTheMemoryForLargeRequests) {
    Channel::ServerSettings settings = patient();
    settings.requestMemory = 1024 * 1024;
    serve(settings);
    std::string const large =
        bytesOf(PRICE, Kind::Request, 2, R"({"a":")" + std::string(900 * 1024, 'x') + "\"}");
    RawPeer first(server->port());
    RawPeer second(server->port());
    RawPeer third(server->port());
    for (RawPeer* const peer : {&first, &second, &third})
        peer->greet();
    // The first has its part and does not go on; small requests of others do.
    first.send(large.substr(0, large.size() - 1));
    second.send(large.substr(0, 100 * 1024));
    third.send(PRICE, Kind::Request, 2, "{}");
    EXPECT_TRUE(third.receive());
    first.send(large.substr(large.size() - 1));
    EXPECT_TRUE(first.receive());
    second.send(large.substr(100 * 1024));
    EXPECT_TRUE(second.receive());
}

TEST_F(HostileClients, WithARequestOverAllTheMemoryGetItAlone) {
    Channel::ServerSettings settings = patient();
    settings.requestMemory = 1024;
    serve(settings);
    RawPeer peer(server->port());
    peer.greet();
    for (std::uint32_t sequence : {2u, 3u}) {
        peer.send(PRICE, Kind::Request, sequence, R"({"a":")" + std::string(900 * 1024, 'x') + "\"}");
        EXPECT_EQ(peer.receive().value().sequence, sequence);
    }
}

TEST_F(HostileClients, ThatLeaveWhileTheyWaitForMemoryLeaveNothingBehind) {
    Channel::ServerSettings settings = patient();
    settings.requestMemory = 1024 * 1024;
    serve(settings);
    std::string const large =
        bytesOf(PRICE, Kind::Request, 2, R"({"a":")" + std::string(900 * 1024, 'x') + "\"}");
    RawPeer first(server->port());
    first.greet();
    first.send(large.substr(0, large.size() - 1));
    {
        RawPeer second(server->port());
        second.greet();
        second.send(large.substr(0, 100 * 1024));
        second.vanish();
    }
    first.send(large.substr(large.size() - 1));
    EXPECT_TRUE(first.receive());
    EXPECT_TRUE(server->hasConnections(1));
    RawPeer third(server->port());
    third.greet();
    third.send(large);
    EXPECT_TRUE(third.receive());
}

TEST_F(HostileClients, ThatSayNothingMakeWayForOthers) {
    Channel::ServerSettings settings = patient();
    settings.maxStrangers = 2;
    serve(settings);
    RawPeer known(server->port());
    known.greet();
    RawPeer first(server->port());
    RawPeer second(server->port());
    RawPeer third(server->port());
    EXPECT_TRUE(first.isClosed());
    EXPECT_TRUE(server->hasConnections(3));
    known.send(PRICE, Kind::Request, 2, "{}");
    EXPECT_TRUE(known.receive());
}

TEST_F(HostileClients, ThatAreManyAndSayNothingLockNobodyOut) {
    serve();
    std::vector<std::unique_ptr<RawPeer>> strangers;
    for (int i = 0; i < 1000; ++i) {
        strangers.push_back(std::make_unique<RawPeer>(server->port()));
        if (i % 250 == 249)
            expectService();
    }
    EXPECT_LE(server->connections(), 257u);
    EXPECT_THAT(log.lines(), IsEmpty());
}

TEST_F(HostileClients, DoNotReachTheLimitOfConnectionsAsStrangers) {
    Channel::ServerSettings settings = patient();
    settings.maxConnections = 1;
    serve(settings);
    RawPeer stranger(server->port());
    RawPeer other(server->port());
    expectService();
}

// --- much

TEST_F(HostileClients, GetARefusalThatIsLongerThanAMessageCutAndLeaveNothingReserved) {
    Channel::ServerSettings settings = patient();
    settings.requestMemory = 1024 * 1024;
    serve(settings, [](std::shared_ptr<Ipc::CmdI> const&, Channel::Answer const&) {
        throw std::runtime_error(std::string(Channel::MAX_TEXT, 'x'));
    });
    RawPeer peer(server->port());
    peer.greet();
    std::string const large = R"({"a":")" + std::string(900 * 1024, 'x') + "\"}";
    for (std::uint32_t sequence : {2u, 3u}) {
        peer.send(PRICE, Kind::Request, sequence, large);
        auto const error = peer.receive();
        ASSERT_TRUE(error);
        EXPECT_EQ(error->sequence, sequence);
        EXPECT_EQ(Channel::reasonOf(error->text), std::string(500, 'x') + " [unexpected]");
    }
}

TEST_F(HostileClients, ThatDoNotTakeTheirAnswersHoldNoMoreMemoryThanAllMayHave) {
    Channel::ServerSettings settings = patient();
    settings.answerMemory = 20 * 1024 * 1024;
    serve(settings, [](std::shared_ptr<Ipc::CmdI> const& cmd, Channel::Answer const& answer) {
        if (auto* const remove = dynamic_cast<Ipc::RemoveCfgNode*>(cmd.get()))
            remove->setResp(std::string(15 * 1024 * 1024, 'x'));
        answer();
    });
    RawPeer first(server->port());
    first.greet();
    first.send(Ipc::RemoveCfgNode::CMD_ID, Kind::Request, 2, "{}");
    RawPeer second(server->port());
    second.greet();
    second.send(Ipc::RemoveCfgNode::CMD_ID, Kind::Request, 2, "{}");
    EXPECT_TRUE(log.hasLogged("Its answer made way for those of others."));
    EXPECT_TRUE(server->hasConnections(1));
    // Which of the two asked first is not known.
    EXPECT_NE(bool(first.receive()), bool(second.receive()));
    expectService();
}

TEST_F(HostileClients, GetNoTreeOfValuesThatIsLargerThanItsBounds) {
    serve();
    RawPeer peer(server->port());
    peer.greet();
    std::string text = R"({"a":[{})";
    while (text.size() < Channel::MAX_TEXT - 4)
        text += ",{}";
    peer.send(PRICE, Kind::Request, 2, text + "]}");
    EXPECT_EQ(
        Channel::reasonOf(peer.receive().value().text),
        "The values of a message of 16777216 bytes would take more than 128 MiB of memory. [too-large]");
    // One large text is no tree.
    peer.send(PRICE, Kind::Request, 3, R"({"a":")" + std::string(15 * 1024 * 1024, '{') + "\"}");
    EXPECT_EQ(peer.receive().value().kind, Kind::Response);
}

// --- the second version

TEST_F(HostileClients, OfTheSecondVersionAreServedWithSeals) {
    serve();
    RawPeer peer(server->port());
    peer.greet(Channel::VERSION);
    for (std::uint32_t sequence : {2u, 3u}) {
        peer.send(PRICE, Kind::Request, sequence, "{}");
        EXPECT_EQ(peer.receive().value().text, R"({"asked":{}})");
    }
}

TEST_F(HostileClients, ThatTakeAConnectionOverHaveNoSeal) {
    serve();
    std::string const request = bytesOf(PRICE, Kind::Request, 2, "{}");
    for (std::string const& seal : {std::string(32, '\0'), std::string(32, 's')}) {
        RawPeer peer(server->port());
        peer.greet(Channel::VERSION);
        peer.send(request + seal);
        EXPECT_EQ(peer.refusal(), "A message is not sealed by the other side of this connection.");
    }
    EXPECT_TRUE(server->hasConnections(0));
}

TEST_F(HostileClients, ThatRepeatAMessageAreRefused) {
    serve();
    RawPeer peer(server->port());
    peer.greet(Channel::VERSION);
    std::string const request = peer.sealed(bytesOf(PRICE, Kind::Request, 2, "{}"));
    peer.send(request);
    EXPECT_TRUE(peer.receive());
    peer.send(request);
    EXPECT_EQ(peer.refusal(), "A message is not sealed by the other side of this connection.");
}

// --- order

TEST_F(HostileClients, ThatSendAheadAreAnsweredInOrder) {
    serve();
    RawPeer peer(server->port());
    peer.greet();
    std::string bytes;
    for (std::uint32_t sequence = 2; sequence < 202; ++sequence)
        bytes += bytesOf(PRICE, Kind::Request, sequence, R"({"n":)" + std::to_string(sequence) + "}");
    peer.send(bytes);
    for (std::uint32_t sequence = 2; sequence < 202; ++sequence) {
        auto const answer = peer.receive();
        ASSERT_TRUE(answer);
        EXPECT_EQ(answer->sequence, sequence);
        EXPECT_EQ(answer->text, R"({"asked":{"n":)" + std::to_string(sequence) + "}}");
    }
}

TEST_F(HostileClients, ThatCloseTheirSendingSideStillGetTheirAnswer) {
    serve();
    RawPeer peer(server->port());
    peer.greet();
    peer.send(PRICE, Kind::Request, 2, "{}");
    peer.finish();
    EXPECT_TRUE(peer.receive());
    EXPECT_TRUE(peer.isClosed());
}

} // namespace
