// The queue of a client's connection, and the handling of commands on the service's side.

#include "tests/channel/running_server.h"

#include "programs/base/error.h"
#include "programs/channel/client_connection.h"
#include "programs/channel/message_text.h"

#include <boost/asio/io_context.hpp>

#include <gmock/gmock.h>

#include <chrono>
#include <thread>

using namespace testing;
using namespace ChannelTest;
using namespace std::chrono_literals;
using Channel::Client;
using Channel::ClientConnection;
using Channel::Kind;

namespace {

/// Notes its steps.
class Noting : public Ipc::PriceEst {
public:
    Noting(std::shared_ptr<Ipc::CmdProcessorI> processor, std::vector<std::string>& steps, std::string name)
        : PriceEst(std::move(processor), {{"n", name}}), steps_(steps), name_(std::move(name)) {}

    bool isHolding = false;

    void sendReqDone() override { note("sent"); }
    void readRespDone() override { note("answered"); }
    void onTransferError(std::string message) override { note("failed: " + message); }
    bool sendNextReqAfterDone() const override { return !isHolding; }

private:
    void note(std::string const& step) { steps_.push_back(name_ + ' ' + step); }

    std::vector<std::string>& steps_;
    std::string name_;
};

class Queue : public Test {
protected:
    SharedLog log;
    std::vector<std::string> steps;
    boost::asio::io_context io;
    std::shared_ptr<ClientConnection> connection;

    ~Queue() override {
        if (connection)
            connection->close();
    }

    void open(Channel::ClientSettings settings) {
        connection = ClientConnection::make(io, std::move(settings));
    }
    void connect() {
        connection->connect([this](std::string const& failure) { steps.push_back("connected " + failure); });
    }
    std::shared_ptr<Noting> make(std::string name) {
        return std::make_shared<Noting>(connection, steps, std::move(name));
    }
    /// Submits a command that closes the connection when it is done.
    void submitLast(std::shared_ptr<Ipc::CmdI> cmd) {
        connection->submit(std::move(cmd), [this](std::string const&) { connection->close(); });
    }
};

TEST_F(Queue, SendsEachRequestWhenTheOneBeforeIsAnswered) {
    RunningServer const server;
    open(server.clientSettings());
    connect();
    connection->submit(make("a"));
    connection->submit(make("b"));
    submitLast(make("c"));
    io.run();
    EXPECT_THAT(steps, ElementsAre("connected ", "a sent", "a answered", "b sent", "b answered", "c sent",
                                   "c answered"));
}

TEST_F(Queue, TakesMoreFromTheFunctionsOfItsRequests) {
    RunningServer const server;
    open(server.clientSettings());
    connect();
    connection->submit(make("a"), [&](std::string const& failure) {
        steps.push_back("done " + failure);
        submitLast(make("c"));
    });
    connection->submit(make("b"));
    io.run();
    EXPECT_THAT(steps, ElementsAre("connected ", "a sent", "a answered", "done ", "b sent", "b answered",
                                   "c sent", "c answered"));
}

TEST_F(Queue, WaitsBehindACommandThatHoldsIt) {
    RunningServer const server;
    open(server.clientSettings());
    connect();
    auto const holding = make("a");
    holding->isHolding = true;
    connection->submit(holding, [&](std::string const&) { steps.push_back("held"); });
    submitLast(make("b"));
    while (steps.size() < 4)
        io.run_one();
    EXPECT_EQ(io.poll(), 0u);
    EXPECT_THAT(steps, ElementsAre("connected ", "a sent", "a answered", "held"));
    connection->sendNext();
    io.run();
    EXPECT_THAT(steps, ElementsAre(_, _, _, _, "b sent", "b answered"));
}

TEST_F(Queue, FailsAsAWholeWhenTheConnectionFails) {
    FakeService service([](RawPeer& peer) {
        peer.welcome();
        peer.receive();
    });
    open(service.clientSettings());
    connect();
    connection->submit(make("a"), [&](std::string const& failure) { steps.push_back("done: " + failure); });
    connection->submit(make("b"));
    io.run();
    std::string const reason = service.name() + ": The other side closed the connection.";
    EXPECT_THAT(steps, ElementsAre("connected ", "a sent", "a failed: " + reason, "done: " + reason,
                                   "b failed: " + reason));
    connection->submit(make("c"));
    EXPECT_EQ(steps.back(), "c failed: " + reason);
}

TEST_F(Queue, FailsAsAWholeWhenItCannotConnect) {
    FakeService service([](RawPeer& peer) { peer.send("nonsense"); });
    open(service.clientSettings());
    connect();
    connection->submit(make("a"));
    io.run();
    std::string const reason = service.name() + ": The first bytes are not those of this protocol.";
    EXPECT_THAT(steps, ElementsAre("connected " + reason, "a failed: " + reason));
}

TEST_F(Queue, FailsAsAWholeWhenItIsClosed) {
    RunningServer const server;
    open(server.clientSettings());
    connect();
    connection->submit(make("a"));
    connection->close();
    connection->close();
    io.run();
    EXPECT_THAT(steps,
                ElementsAre("connected The connection was closed.", "a failed: The connection was closed."));
}

TEST_F(Queue, GivesUpARequestWhoseTurnDoesNotComeInTime) {
    FakeService service([](RawPeer& peer) {
        peer.welcome();
        auto const first = peer.receive();
        // Longer than the second request may take.
        peer.receive();
        peer.send(first->command, Kind::Response, first->sequence, "{}");
    });
    auto settings = service.clientSettings();
    bool isShort = false;
    settings.requestTime = [&](Ipc::Timeouts::TimeoutId) { return isShort ? 50ms : 60'000ms; };
    open(settings);
    connect();
    connection->submit(make("a"));
    while (steps.size() < 2)
        io.run_one();
    isShort = true;
    connection->submit(make("b"), [&](std::string const&) { connection->close(); });
    io.run();
    EXPECT_THAT(steps, ElementsAre("connected ", "a sent", "b failed: Its turn did not come within 0.050 s.",
                                   "a failed: The connection was closed."));
}

TEST_F(Queue, GivesUpRequestsAlsoBeforeItIsConnected) {
    FakeService service([](RawPeer& peer) { peer.receive(), peer.receive(); });
    auto settings = service.clientSettings();
    settings.requestTime = [](Ipc::Timeouts::TimeoutId) { return 50ms; };
    open(settings);
    connect();
    connection->submit(make("a"), [&](std::string const&) { connection->close(); });
    io.run();
    EXPECT_THAT(steps, ElementsAre("a failed: Its turn did not come within 0.050 s.",
                                   "connected The connection was closed."));
}

TEST_F(Queue, WaitsWithoutALimitWhenTheTimeIsZero) {
    RunningServer const server;
    auto settings = server.clientSettings();
    settings.requestTime = [](Ipc::Timeouts::TimeoutId) { return 0ms; };
    open(settings);
    connect();
    submitLast(make("a"));
    io.run();
    EXPECT_THAT(steps, ElementsAre("connected ", "a sent", "a answered"));
}

TEST_F(Queue, RefusesStepsThatAreNotACommandsTurn) {
    RunningServer const server;
    open(server.clientSettings());
    connect();
    auto const early = make("early");
    early->sendReq();
    early->readResp();
    early->readReq();
    early->sendResp();
    submitLast(make("a"));
    io.run();
    EXPECT_THAT(steps,
                ElementsAre("early failed: It is not its turn.",
                            "early failed: There is nothing to be read for it.",
                            "early failed: There is nothing to be read for it.",
                            "early failed: It is not its turn.", "connected ", "a sent", "a answered"));
}

TEST_F(Queue, EndsTheConnectionWhenAStepThrowsBehindTheRequest) {
    class Throwing : public Ipc::PriceEst {
    public:
        using PriceEst::PriceEst;
        void sendReqDone() override { throw std::runtime_error("no room"); }
        void onTransferError(std::string message) override { failure = message; }
        std::string failure;
    };
    RunningServer const server;
    open(server.clientSettings());
    connect();
    auto const cmd = std::make_shared<Throwing>(connection);
    connection->submit(cmd);
    io.run();
    EXPECT_THAT(cmd->failure, EndsWith(": no room [unexpected]"));
}

TEST_F(Queue, LetsTwoHundredClientsWorkAtOnce) {
    RunningServer const server;
    std::vector<std::shared_ptr<ClientConnection>> clients;
    int answered = 0;
    for (int i = 0; i < 200; ++i) {
        auto const client = ClientConnection::make(io, server.clientSettings());
        clients.push_back(client);
        client->connect([](std::string const& failure) { EXPECT_EQ(failure, ""); });
        for (int n = 0; n < 10; ++n) {
            auto const cmd = std::make_shared<Ipc::PriceEst>(client, json::Object{{"client", i}, {"n", n}});
            client->submit(cmd, [&answered, client, cmd, i, n](std::string const& failure) {
                EXPECT_EQ(failure, "");
                json::Object const asked = cmd->resp().get("asked").toObject();
                EXPECT_EQ(asked.get("client").intOrZero(), i);
                EXPECT_EQ(asked.get("n").intOrZero(), n);
                ++answered;
                if (n == 9)
                    client->close();
            });
        }
    }
    io.run();
    EXPECT_EQ(answered, 2000);
    EXPECT_THAT(log.lines(), IsEmpty());
}

// --- the service's side

class Handling : public Test {
protected:
    SharedLog log;

    static std::string errorOf(RunningServer const& server) {
        Client client(server.clientSettings());
        try {
            client.call<Ipc::PriceEst>(json::Object{});
        } catch (Base::Error const& e) {
            return e.what();
        }
        return "no error";
    }
};

TEST_F(Handling, MayEndOnAnotherThread) {
    std::vector<std::thread> workers;
    std::mutex mutex;
    RunningServer server(patient(), [&](std::shared_ptr<Ipc::CmdI> cmd, Channel::Answer answer) {
        std::lock_guard const guard(mutex);
        workers.emplace_back([cmd = std::move(cmd), answer = std::move(answer)]() mutable {
            dynamic_cast<Ipc::PriceEst&>(*cmd).setResp({{"from", "a worker"}});
            cmd.reset();
            answer();
        });
    });
    Client client(server.clientSettings());
    for (int i = 0; i < 20; ++i)
        EXPECT_EQ(Channel::print(client.call<Ipc::PriceEst>(json::Object{})->resp()),
                  R"({"from":"a worker"})");
    std::lock_guard const guard(mutex);
    for (std::thread& worker : workers)
        worker.join();
}

TEST_F(Handling, ThatTakesLongHoldsUpNobodyElse) {
    std::promise<Channel::Answer> slow;
    RunningServer server(patient(),
                         [&](std::shared_ptr<Ipc::CmdI> const& cmd, Channel::Answer const& answer) {
                             if (cmd->id() == Ipc::RemoveCfgNode::CMD_ID)
                                 slow.set_value(answer);
                             else
                                 answer();
                         });
    RawPeer waiting(server.port());
    waiting.greet();
    waiting.send(Ipc::RemoveCfgNode::CMD_ID, Kind::Request, 2, R"({"id":"a=acme"})");
    Channel::Answer const answer = slow.get_future().get();
    EXPECT_EQ(errorOf(server), "no error");
    answer();
    answer();
    answer.fail("too late");
    EXPECT_EQ(waiting.receive().value().kind, Kind::Response);
    waiting.send(Ipc::PriceEst::CMD_ID, Kind::Request, 3, "{}");
    EXPECT_EQ(waiting.receive().value().sequence, 3u);
}

TEST_F(Handling, MayFailWithAReason) {
    RunningServer const server(patient(),
                               [](std::shared_ptr<Ipc::CmdI> const&, Channel::Answer const& answer) {
                                   answer.fail("The disk is full.");
                               });
    EXPECT_EQ(errorOf(server), "The service refuses: The disk is full.");
}

TEST_F(Handling, MayFailWithBytesThatAreNoText) {
    RunningServer const server(patient(), [](std::shared_ptr<Ipc::CmdI> const&,
                                             Channel::Answer const& answer) { answer.fail("caf\xe9"); });
    EXPECT_EQ(errorOf(server), "The service refuses: caf\xEF\xBF\xBD");
}

TEST_F(Handling, ThatForgetsToAnswerIsAFailure) {
    RunningServer const server(patient(), [](std::shared_ptr<Ipc::CmdI> const&, Channel::Answer const&) {});
    EXPECT_EQ(errorOf(server), "The service refuses: The service gave no answer.");
}

TEST_F(Handling, WithAnAnswerThatCannotBePrintedIsAFailure) {
    RunningServer const server(patient(),
                               [](std::shared_ptr<Ipc::CmdI> const& cmd, Channel::Answer const& answer) {
                                   dynamic_cast<Ipc::PriceEst&>(*cmd).setResp({{"a", "\xff"}});
                                   answer();
                               });
    EXPECT_EQ(errorOf(server),
              "The service refuses: JSON error: a text that is not valid UTF-8 cannot be printed");
}

TEST_F(Handling, WithAnAnswerOverTheLimitIsAFailure) {
    RunningServer const server(
        patient(), [](std::shared_ptr<Ipc::CmdI> const& cmd, Channel::Answer const& answer) {
            dynamic_cast<Ipc::PriceEst&>(*cmd).setResp({{"a", std::string(16 * 1024 * 1024, 'x')}});
            answer();
        });
    EXPECT_EQ(errorOf(server),
              "The service refuses: A message of 16777224 bytes is over the limit of 16777216.");
}

TEST_F(Handling, MayOutliveItsClient) {
    std::promise<std::pair<std::shared_ptr<Ipc::CmdI>, Channel::Answer>> slow;
    RunningServer server(patient(), [&](std::shared_ptr<Ipc::CmdI> cmd, Channel::Answer answer) {
        slow.set_value({std::move(cmd), std::move(answer)});
    });
    {
        RawPeer peer(server.port());
        peer.greet();
        peer.send(Ipc::PriceEst::CMD_ID, Kind::Request, 2, "{}");
        peer.vanish();
    }
    auto const [cmd, answer] = slow.get_future().get();
    answer();
    EXPECT_TRUE(server.hasConnections(0));
}

TEST_F(Handling, GivesTheCommandsAProcessorThatSendsNothing) {
    std::promise<void> handled;
    RunningServer server(patient(),
                         [&](std::shared_ptr<Ipc::CmdI> const& cmd, Channel::Answer const& answer) {
                             cmd->processor()->submit(cmd);
                             cmd->readReq();
                             cmd->sendReq();
                             answer();
                         });
    EXPECT_EQ(errorOf(server), "no error");
    std::string const failed = "Command Price Estimate failed in transfer. ";
    EXPECT_THAT(log.lines(), ElementsAre(failed + "A service sends no requests.",
                                         failed + "There is nothing to be read for it.",
                                         failed + "Nobody has asked for it."));
}

// --- the end of a service

TEST_F(Handling, IsFinishedBeforeAServiceStops) {
    std::promise<Channel::Answer> slow;
    RunningServer server(patient(), [&](std::shared_ptr<Ipc::CmdI> const&, Channel::Answer const& answer) {
        slow.set_value(answer);
    });
    RawPeer idle(server.port());
    idle.greet();
    RawPeer waiting(server.port());
    waiting.greet();
    waiting.send(Ipc::PriceEst::CMD_ID, Kind::Request, 2, "{}");
    Channel::Answer const answer = slow.get_future().get();
    server.onThread([](Channel::Server& s) { s.stop(); });
    EXPECT_TRUE(idle.isClosed());
    EXPECT_THROW(RawPeer(server.port()), boost::system::system_error);
    EXPECT_EQ(server.connections(), 1u);
    answer();
    EXPECT_TRUE(waiting.receive());
    EXPECT_TRUE(waiting.isClosed());
    EXPECT_TRUE(server.hasConnections(0));
}

TEST(Servers, LeaveNothingInTheIoContextWhenTheyHaveStopped) {
    boost::asio::io_context io;
    Channel::ServerSettings settings;
    settings.token = TOKEN;
    Channel::Server server(io, settings, Ipc::makeEmptyCmd, Channel::acceptAtOnce(std::make_shared<Echo>()));
    auto const client = ClientConnection::make(io, [&] {
        Channel::ClientSettings clientSettings;
        clientSettings.host = "127.0.0.1";
        clientSettings.port = server.port();
        clientSettings.token = TOKEN;
        return clientSettings;
    }());
    client->connect([&](std::string const&) {
        client->close();
        server.stop();
    });
    // Returns when there is nothing left to do.
    io.run();
    EXPECT_EQ(server.connections(), 0u);
}

TEST(Servers, MayGoWhileTheirClientsAreConnected) {
    boost::asio::io_context io;
    Channel::ServerSettings settings;
    settings.token = TOKEN;
    auto server = std::make_optional<Channel::Server>(io, settings, Ipc::makeEmptyCmd,
                                                      Channel::acceptAtOnce(std::make_shared<Echo>()));
    Channel::ClientSettings clientSettings;
    clientSettings.host = "127.0.0.1";
    clientSettings.port = server->port();
    clientSettings.token = TOKEN;
    auto const client = ClientConnection::make(io, clientSettings);
    client->connect([&](std::string const&) { server.reset(); });
    auto const cmd = std::make_shared<Ipc::PriceEst>(client, json::Object{});
    std::string failure;
    client->submit(cmd, [&](std::string const& reason) { failure = reason; });
    SharedLog const log;
    io.run();
    EXPECT_NE(failure, "");
}

TEST(Servers, RefuseWhatTheyCannotListenOn) {
    boost::asio::io_context io;
    auto const refusal = [&](Channel::ServerSettings const& settings) -> std::string {
        try {
            Channel::Server(io, settings, Ipc::makeEmptyCmd, {});
        } catch (Base::Error const& e) {
            return e.what();
        }
        return "no refusal";
    };
    Channel::ServerSettings settings;
    EXPECT_EQ(refusal(settings), "An access token has at least 32 characters.");
    settings.token = TOKEN;
    settings.address = "localhost";
    EXPECT_EQ(refusal(settings), "\"localhost\" is no IP address to listen on.");
    settings.address = "0.0.0.0";
    EXPECT_EQ(refusal(settings), "TLS on 0.0.0.0 needs a certificate and its private key; only a loopback "
                                 "address can do without TLS.");
    settings.address = "127.0.0.1";
    boost::asio::ip::tcp::acceptor const taken(io, {boost::asio::ip::address_v4::loopback(), 0});
    settings.port = taken.local_endpoint().port();
    EXPECT_EQ(refusal(settings),
              "Cannot listen on 127.0.0.1:" + std::to_string(settings.port) +
                  ": Address already in use; end what listens there, or listen elsewhere.");
}

} // namespace
