// What a client does with services that are broken, silent or not what they seem: it fails in time, with a
// clear line.

#include "tests/channel/running_server.h"
#include "tests/support/coded_lines.h"

#include "programs/base/error.h"

#include "vlservice/ipc/cfg_ids_for_user.h"
#include "vlservice/ipc/cfg_ids_tree.h"

#include "tests/support/json_literal.h"

#include <gmock/gmock.h>

#include <chrono>
#include <future>

using namespace testing;
using namespace ChannelTest;
using namespace std::chrono_literals;
using Channel::Client;
using Channel::Kind;
using VLServiceTest::messageOf;

namespace {

/// Waits until the client has gone.
void wait(RawPeer& peer) {
    while (peer.receive()) {
    }
}

class BrokenServices : public Test {
protected:
    SharedLog log;

    /// The error of connecting, without the service's name in front.
    static std::string connectError(FakeService& service, std::chrono::milliseconds time = 60s) {
        auto settings = service.clientSettings();
        settings.connectTime = time;
        return withoutName(service, messageOf<Base::Error>([&] { Client client(settings); }));
    }

    static std::string withoutName(FakeService& service, std::string const& error) {
        std::string const name = service.name() + ": ";
        return error.starts_with(name) ? error.substr(name.size()) : "without its name: " + error;
    }

    /// The error of a first request, and whether a second one is answered.
    struct Outcome {
        std::string error;
        std::string next;
    };
};

// --- connecting

TEST(Clients, SayThatNobodyIsThere) {
    std::uint16_t const port = freePort();
    Channel::ClientSettings settings;
    settings.host = "127.0.0.1";
    settings.port = port;
    settings.token = TOKEN;
    EXPECT_EQ(messageOf<Base::Error>([&] { Client client(settings); }),
              "127.0.0.1:" + std::to_string(port) + ": Nobody answers there: Connection refused.");
    settings.host = "::1";
    EXPECT_THAT(messageOf<Base::Error>([&] { Client client(settings); }),
                StartsWith("[::1]:" + std::to_string(port) + ": Nobody answers there: "));
}

TEST(Clients, FindAServiceByItsName) {
    RunningServer const server;
    auto settings = server.clientSettings();
    settings.host = "service.example";
    settings.lookUp = [](std::string const& host) {
        // The system is asked by number: not each has a name for the loopback address.
        return host == "service.example" ? Channel::lookUpHost("127.0.0.1") : std::vector<std::string>();
    };
    Client client(settings);
    EXPECT_TRUE(client.call<Ipc::PriceEst>(json::Object{})->resp().get("asked"));
}

TEST(Clients, GiveANameServerThatIsSilentUpInTime) {
    std::promise<void> answer;
    std::promise<void> answered;
    Channel::ClientSettings settings;
    settings.host = "service.example";
    settings.port = 4711;
    settings.token = TOKEN;
    settings.connectTime = 50ms;
    settings.lookUp = [&, wait = answer.get_future().share()](std::string const&) {
        wait.wait();
        answered.set_value();
        return std::vector<std::string>();
    };
    EXPECT_EQ(messageOf<Base::Error>([&] { Client client(settings); }),
              "service.example:4711: It does not let us in within 0.050 s.");
    // The client has gone; its thread notices nothing.
    answer.set_value();
    answered.get_future().wait();
}

TEST(Clients, SayWhyAHostIsNotFound) {
    Channel::ClientSettings settings;
    settings.host = "service.example";
    settings.port = 4711;
    settings.token = TOKEN;
    settings.lookUp = [](std::string const&) -> std::vector<std::string> {
        throw Base::Error(Base::Code::ServiceUnreachable, "The host cannot be found: Not today.");
    };
    EXPECT_EQ(messageOf<Base::Error>([&] { Client client(settings); }),
              "service.example:4711: The host cannot be found: Not today.");
    settings.lookUp = [](std::string const&) { return std::vector<std::string>(); };
    EXPECT_THAT(messageOf<Base::Error>([&] { Client client(settings); }),
                StartsWith("service.example:4711: Nobody answers there: "));
    settings.lookUp = &Channel::lookUpHost;
    settings.host = "no..name";
    EXPECT_THAT(messageOf<Base::Error>([&] { Client client(settings); }),
                StartsWith("no..name:4711: The host cannot be found: "));
}

TEST_F(BrokenServices, ThatAreSilentAreLeftInTime) {
    FakeService service([](RawPeer& peer) { wait(peer); });
    EXPECT_EQ(connectError(service, 50ms), "It does not let us in within 0.050 s.");
}

TEST_F(BrokenServices, ThatSpeakSomethingElseAreLeft) {
    FakeService service([](RawPeer& peer) {
        peer.send("SSH-2.0-Server\r\n");
        wait(peer);
    });
    EXPECT_EQ(connectError(service), "The first bytes are not those of this protocol.");
}

TEST_F(BrokenServices, ThatCloseInTheGreetingAreTold) {
    FakeService service([](RawPeer& peer) { peer.receive(); });
    EXPECT_EQ(connectError(service), "The other side closed the connection.");
}

TEST_F(BrokenServices, ThatRefuseAreQuoted) {
    FakeService service([](RawPeer& peer) {
        peer.receive();
        peer.send(Channel::preface() + bytesOf(0, Kind::Error, 0, R"({"err":"Not today."})"));
        wait(peer);
    });
    EXPECT_EQ(connectError(service), "It refuses: Not today.");
}

TEST_F(BrokenServices, ThatDoNotKnowTheTokenGetNoProof) {
    FakeService service([](RawPeer& peer) {
        peer.receive();
        peer.send(Channel::preface() + bytesOf(0, Kind::Response, 0, R"({"nonce":"n","proof":"p"})"));
        EXPECT_TRUE(peer.isClosed());
    });
    EXPECT_EQ(connectError(service), NO_KNOWLEDGE);
}

TEST_F(BrokenServices, ThatGreetInAnotherWayAreLeft) {
    for (std::string const& greeting :
         {bytesOf(1, Kind::Response, 0, "{}"), bytesOf(0, Kind::Request, 0, "{}"),
          bytesOf(0, Kind::Response, 1, "{}")}) {
        FakeService service([&](RawPeer& peer) {
            peer.receive();
            peer.send(Channel::preface() + greeting);
            wait(peer);
        });
        EXPECT_EQ(connectError(service), "It does not greet.");
    }
}

TEST(Clients, WithAnotherTokenKnowThatItIsNotTheServices) {
    RunningServer const server;
    auto settings = server.clientSettings();
    settings.token = TOKEN + "x";
    EXPECT_THAT(messageOf<Base::Error>([&] { Client client(settings); }),
                EndsWith(std::string(": ") + NO_KNOWLEDGE));
}

// --- services of the first version

void refuseVersion(RawPeer& peer) {
    peer.receive();
    peer.send(Channel::preface(Channel::VERSION_1) +
              bytesOf(0, Kind::Error, 0,
                      R"({"err":"Version 2 of the protocol is not spoken here, only version 1."})"));
    peer.finish();
    wait(peer);
}

TEST_F(BrokenServices, OfTheFirstVersionAreLeft) {
    FakeService service(refuseVersion);
    EXPECT_EQ(
        connectError(service),
        "It speaks version 1 of the connection alone, in which others on the way can speak for us; bring "
        "it up to date, or add --allow-channel-1 to go on with it.");
}

TEST_F(BrokenServices, OfTheFirstVersionAreSpokenToWhereThatIsAllowed) {
    int connection = 0;
    FakeService service(
        [&](RawPeer& peer) {
            if (connection++ == 0)
                return refuseVersion(peer);
            peer.welcome(Channel::VERSION_1);
            peer.receive();
            peer.send(PRICE, Kind::Response, 2, R"({"cents":3})");
            wait(peer);
        },
        2);
    auto settings = service.clientSettings();
    settings.allowsVersion1 = true;
    Client client(settings);
    EXPECT_EQ(client.call<Ipc::PriceEst>(json::Object{})->resp().get("cents").intOrZero(), 3);
}

TEST_F(BrokenServices, ThatAnswerInTheFirstVersionWithoutARefusalAreLeft) {
    FakeService service([](RawPeer& peer) {
        peer.receive();
        peer.send(Channel::preface(Channel::VERSION_1) + bytesOf(0, Kind::Response, 0, "{}"));
        wait(peer);
    });
    auto settings = service.clientSettings();
    settings.allowsVersion1 = true;
    EXPECT_EQ(withoutName(service, messageOf<Base::Error>([&] { Client client(settings); })),
              "It does not greet.");
}

// --- strangers in between

TEST_F(BrokenServices, ThatPassWhatIsSaidToTheRealOneLearnNothing) {
    RunningServer real;
    FakeService service([&](RawPeer& peer) {
        RawPeer passedOn(real.port());
        passedOn.send(Channel::preface());
        ChannelTest::Message const challenge = peer.receive().value();
        passedOn.send(challenge.command, challenge.kind, challenge.sequence, challenge.text);
        ChannelTest::Message const answer = passedOn.receive().value();
        peer.send(Channel::preface() + bytesOf(answer.command, answer.kind, answer.sequence, answer.text));
        EXPECT_TRUE(peer.isClosed());
    });
    EXPECT_EQ(connectError(service), NO_KNOWLEDGE);
}

TEST_F(BrokenServices, WhoseAnswersHaveNoSealAreLeft) {
    FakeService service([](RawPeer& peer) {
        peer.welcome();
        peer.receive();
        peer.send(bytesOf(PRICE, Kind::Response, 2, R"({"cents":3})") + std::string(32, 's'));
        wait(peer);
    });
    Client client(service.clientSettings());
    EXPECT_EQ(messageOf<Base::Error>([&] { client.call<Ipc::PriceEst>(json::Object{}); }),
              service.name() + ": " + NOT_SEALED);
}

// --- requests

TEST_F(BrokenServices, ThatGiveNoAnswerAreLeftInTime) {
    FakeService service([](RawPeer& peer) {
        peer.welcome();
        wait(peer);
    });
    auto settings = service.clientSettings();
    settings.requestTime = [](Ipc::Timeouts::TimeoutId id) {
        return id == Ipc::Timeouts::TIMEOUT_ID_3 ? 50ms : 60s;
    };
    Client client(settings);
    std::string const expected = service.name() + ": It gives no answer within 0.050 s.";
    EXPECT_EQ(messageOf<Base::Error>([&] { client.call<Ipc::PriceEst>(json::Object{}); }), expected);
    EXPECT_THAT(log.lines(), ElementsAre("Command Price Estimate failed in transfer. " + expected));
    // There is nothing left to wait for.
    EXPECT_EQ(messageOf<Base::Error>([&] { client.call<Ipc::CfgIdsTree>(); }), expected);
}

TEST_F(BrokenServices, ThatDoNotEvenReadAreLeftInTime) {
    std::promise<void> left;
    FakeService service([&](RawPeer& peer) {
        peer.welcome();
        left.get_future().wait();
    });
    auto settings = service.clientSettings();
    settings.requestTime = [](Ipc::Timeouts::TimeoutId) { return 100ms; };
    Client client(settings);
    json::Object const large{{"a", std::string(15 * 1024 * 1024, 'x')}};
    EXPECT_EQ(messageOf<Base::Error>([&] { client.call<Ipc::PriceEst>(large); }),
              service.name() + ": It gives no answer within 0.100 s.");
    left.set_value();
}

struct Fatal {
    char const* name;
    std::string answer;
    std::string error;
};

/// Answers of a service, behind which it closes, that end the connection.
class FatalAnswers : public BrokenServices, public WithParamInterface<Fatal> {};

TEST_P(FatalAnswers, FailTheRequestAndWhatFollows) {
    FakeService service([](RawPeer& peer) {
        peer.welcome();
        peer.receive();
        if (!GetParam().answer.empty())
            peer.sendSealed(GetParam().answer);
        peer.finish();
        wait(peer);
    });
    Client client(service.clientSettings());
    std::string const expected = service.name() + ": " + GetParam().error;
    EXPECT_EQ(messageOf<Base::Error>([&] { client.call<Ipc::PriceEst>(json::Object{}); }), expected);
    EXPECT_EQ(messageOf<Base::Error>([&] { client.call<Ipc::PriceEst>(json::Object{}); }), expected);
    for (std::string const& line : log.lines())
        EXPECT_EQ(wordsOf(line), "Command Price Estimate failed in transfer. " + expected);
}

INSTANTIATE_TEST_SUITE_P(
    Answers, FatalAnswers,
    Values(Fatal{"None", "", "The other side closed the connection."},
           Fatal{"UnknownKind", std::string("\x18\7\0\0\0\2\0\0\0\0", 10), "There is no message of kind 7."},
           Fatal{"GreatLength", std::string("\x18\2\0\0\0\2\xff\0\0\0", 10),
                 "A message of 4278190080 bytes is over the limit of 16777216."},
           Fatal{"OtherSequence", bytesOf(PRICE, Kind::Response, 3, "{}"), "It answers what was not asked."},
           Fatal{"OtherCommand", bytesOf(25, Kind::Response, 2, "{}"), "It answers what was not asked."},
           Fatal{"Request", bytesOf(PRICE, Kind::Request, 2, "{}"), "It answers what was not asked."},
           Fatal{"ErrorOfTheConnection", bytesOf(0, Kind::Error, 0, R"({"err":"Shutting down."})"),
                 "It closes the connection: Shutting down."},
           Fatal{"ErrorWithoutAReason", bytesOf(0, Kind::Error, 0, "{"),
                 "It closes the connection: It gave no reason."}),
    [](auto const& instance) { return instance.param.name; });

TEST_F(BrokenServices, ThatBreakOffAnywhereInAnAnswerAreTold) {
    std::string const answer = bytesOf(PRICE, Kind::Response, 2, R"({"cents":3})");
    for (std::size_t length = 1; length < answer.size() + Channel::Seal::SIZE; ++length) {
        FakeService service([&](RawPeer& peer) {
            peer.welcome();
            peer.receive();
            peer.send(peer.sealed(answer).substr(0, length));
        });
        Client client(service.clientSettings());
        EXPECT_EQ(messageOf<Base::Error>([&] { client.call<Ipc::PriceEst>(json::Object{}); }),
                  service.name() + ": The connection ended in the middle of a message.");
    }
}

TEST_F(BrokenServices, ThatVanishAreTold) {
    FakeService service([](RawPeer& peer) {
        peer.welcome();
        peer.receive();
        peer.vanish();
    });
    Client client(service.clientSettings());
    EXPECT_EQ(messageOf<Base::Error>([&] { client.call<Ipc::PriceEst>(json::Object{}); }),
              service.name() + ": Connection reset by peer.");
}

struct Harmless {
    char const* name;
    Kind kind;
    std::string text;
    std::string error;
};

/// Answers that fail their own request alone.
class HarmlessAnswers : public BrokenServices, public WithParamInterface<Harmless> {};

TEST_P(HarmlessAnswers, LeaveTheConnectionInUse) {
    FakeService service([](RawPeer& peer) {
        peer.welcome();
        peer.receive();
        peer.send(Ipc::CfgIdsForUser::CMD_ID, GetParam().kind, 2, GetParam().text);
        peer.receive();
        peer.send(PRICE, Kind::Response, 3, R"({"cents":3})");
        wait(peer);
    });
    Client client(service.clientSettings());
    EXPECT_EQ(messageOf<Base::Error>([&] { client.call<Ipc::CfgIdsForUser>("bob"); }), GetParam().error);
    EXPECT_EQ(client.call<Ipc::PriceEst>(json::Object{})->resp().get("cents").intOrZero(), 3);
}

INSTANTIATE_TEST_SUITE_P(
    Answers, HarmlessAnswers,
    Values(Harmless{"Error", Kind::Error, R"({"err":"No."})", "The service refuses: No."},
           Harmless{"ErrorWithoutAReason", Kind::Error, "{}", "The service refuses: It gave no reason."},
           Harmless{"NoJson", Kind::Response, "x",
                    "The answer cannot be used: JSON error: '[' or '{' expected near 'x' (line 1, column 1)"},
           Harmless{"BodyThatTheCommandRefuses", Kind::Response, "{}",
                    "The answer cannot be used: JSON error: Wrong type: empty. Expected type: array"}),
    [](auto const& instance) { return instance.param.name; });

TEST_F(BrokenServices, ThatAnswerWithATreeOfValuesOverItsBoundsLeaveTheConnectionInUse) {
    FakeService service([](RawPeer& peer) {
        peer.welcome();
        peer.receive();
        // The longest text that a message can have, nearly all of it lists.
        std::string text(Channel::MAX_TEXT, '[');
        text.replace(0, 5, R"({"a":)");
        peer.send(PRICE, Kind::Response, 2, text);
        peer.receive();
        peer.send(PRICE, Kind::Response, 3, R"({"cents":3})");
        wait(peer);
    });
    Client client(service.clientSettings());
    EXPECT_EQ(messageOf<Base::Error>([&] { client.call<Ipc::PriceEst>(json::Object{}); }),
              "The answer cannot be used: The values of a message of 16777216 bytes would take more than "
              "256 MiB of memory.");
    EXPECT_EQ(client.call<Ipc::PriceEst>(json::Object{})->resp().get("cents").intOrZero(), 3);
}

// --- commands that cannot be sent

class UnsendableCommands : public Test {
protected:
    SharedLog log;
    RunningServer server;
    Client client{server.clientSettings()};

    void TearDown() override {
        // The connection is still good.
        client.call<Ipc::PriceEst>(json::Object{});
    }
};

TEST_F(UnsendableCommands, AreThoseOfOthers) {
    EXPECT_EQ(messageOf<Base::Error>([&] { client.send(std::make_shared<Ipc::PriceEst>(nullptr)); }),
              "It was not built for this connection.");
    Client other(server.clientSettings());
    EXPECT_EQ(
        messageOf<Base::Error>([&] { client.send(std::make_shared<Ipc::PriceEst>(other.processor())); }),
        "It was not built for this connection.");
}

TEST_F(UnsendableCommands, AreTheTooLarge) {
    json::Object const tooLarge{{"a", std::string(16 * 1024 * 1024, 'x')}};
    EXPECT_EQ(messageOf<Base::Error>([&] { client.call<Ipc::PriceEst>(tooLarge); }),
              "A message of 16777224 bytes is over the limit of 16777216.");
}

TEST_F(UnsendableCommands, AreThoseWithTextThatIsNoUtf8) {
    EXPECT_EQ(messageOf<Base::Error>([&] {
                  client.call<Ipc::PriceEst>(json::Object{{"a", "\xff"}});
              }),
              "JSON error: a text that is not valid UTF-8 cannot be printed");
}

TEST(Commands, MayOutliveTheirClient) {
    RunningServer const server;
    std::shared_ptr<Ipc::PriceEst> cmd;
    {
        Client client(server.clientSettings());
        cmd = client.call<Ipc::PriceEst>(json::Object{});
    }
    SharedLog log;
    cmd->processor()->submit(cmd);
    EXPECT_THAT(log.lines(),
                ElementsAre("Command Price Estimate failed in transfer. The connection was closed."));
}

} // namespace
