// Data: what a piece of a page is written as, what is refused, and how pieces travel.

#include "programs/base/error.h"
#include "programs/channel/data_message.h"
#include "tests/channel/running_server.h"

#include "tests/support/failure_of.h"
#include "tests/support/format_document.h"

#include <gmock/gmock.h>

#include <deque>
#include <limits>

using namespace testing;
using namespace ChannelTest;
using namespace std::chrono_literals;
using namespace std::string_literals;
using Channel::Client;
using Channel::DataPiece;
using Channel::Kind;
using Channel::MAX_PIECE;

namespace {

DataPiece pieceOf(std::string_view bytes, std::uint32_t position = 7) {
    return {"p1", position, "bill.pdf", "3", bytes.size(), 0, bytes};
}

std::string textOf(std::string_view bytes, std::uint32_t position = 7) {
    return Channel::printData(pieceOf(bytes, position));
}

TEST(DataMessages, ReadBackAsTheyWereWritten) {
    std::string const text = Channel::printData({"p1", 0x01020304, "d", "p", 0x0102030405060708, 5, "bytes"});
    EXPECT_EQ(text, "\2p1\1\2\3\4\0\1d\0\1p\1\2\3\4\5\6\7\x8\0\0\0\0\0\0\0\5bytes"s);
    DataPiece const piece = Channel::parseData(text);
    EXPECT_EQ(piece.packId, "p1");
    EXPECT_EQ(piece.position, 0x01020304u);
    EXPECT_EQ(piece.document, "d");
    EXPECT_EQ(piece.page, "p");
    EXPECT_EQ(piece.size, 0x0102030405060708u);
    EXPECT_EQ(piece.offset, 5u);
    EXPECT_EQ(piece.bytes, "bytes");
    EXPECT_FALSE(piece.isLast());
    EXPECT_TRUE(Channel::parseData(textOf("all of it")).isLast());
}

TEST(DataMessages, AreRefusedWhenTheyAreCutAnywhereInFrontOfTheirBytes) {
    std::string const text = textOf("x");
    for (std::size_t length = 0; length < text.size(); ++length)
        EXPECT_THROW(Channel::parseData(text.substr(0, length)), Base::Error) << length;
}

constexpr auto BEHIND_THE_END = "A data message holds bytes behind the end of its page.";

TEST(DataMessages, HoldOneByteToOneMebibyteInsideTheirPage) {
    auto const refusal = [](DataPiece const& piece) { return failureOf([&] { Channel::printData(piece); }); };
    std::string const most(MAX_PIECE, 'x');
    EXPECT_EQ(refusal(pieceOf(most)), "nothing was thrown");
    EXPECT_EQ(refusal(pieceOf(most + 'x')),
              "A data message holds 1048577 bytes of a page, and 1 to 1048576 is what it may.");
    EXPECT_EQ(refusal(pieceOf("")),
              "A data message holds 0 bytes of a page, and 1 to 1048576 is what it may.");
    EXPECT_EQ(refusal({"p", 0, "d", "p", 2, 0, "xyz"}), BEHIND_THE_END);
    EXPECT_EQ(refusal({"p", 0, "d", "p", 3, 4, "x"}), BEHIND_THE_END);
    EXPECT_EQ(refusal({"p", 0, "d", "p", 3, std::numeric_limits<std::uint64_t>::max(), "x"}), BEHIND_THE_END);
    EXPECT_EQ(refusal({"p", 0, std::string(65536, 'd'), "p", 1, 0, "x"}),
              "The name of a document has 65536 bytes, and 65535 is the most that can be sent.");
}

TEST(DataMessages, AreShownInTheDescription) {
    std::string message;
    Channel::appendFrame(message, {Channel::PACK_DATA, Kind::Data, 3, textOf("TEZ...", 0)});
    EXPECT_EQ(VLServiceTest::documentBlock(VLSERVICE_DOCS "/formats-channel.md", "hexdump data"),
              VLServiceTest::hexDump(message));
    std::string stored;
    Channel::appendFrame(stored, {Channel::PACK_DATA, Kind::Stored, 3, ""});
    EXPECT_EQ(VLServiceTest::documentBlock(VLSERVICE_DOCS "/formats-channel.md", "hexdump stored"),
              VLServiceTest::hexDump(stored));
}

// --- travelling

/// A service that keeps what it was sent, and says so at once or when it is told to.
class DataTravel : public Test {
protected:
    SharedLog log;
    std::mutex mutex;
    std::condition_variable came;
    std::vector<std::string> kept;
    std::vector<Channel::DataStored> unanswered;
    bool answersAtOnce = true;
    std::string refusal;
    std::optional<RunningServer> server;

    void serve(Channel::ServerSettings const& settings = patient()) {
        server.emplace(settings, nullptr, [this](Channel::ReceivedData data, Channel::DataStored stored) {
            std::lock_guard const guard(mutex);
            kept.push_back(std::move(data.text));
            came.notify_all();
            if (!refusal.empty())
                stored.fail(refusal);
            else if (answersAtOnce)
                stored();
            else
                unanswered.push_back(stored);
        });
    }

    static Client::DataSource sourceOf(std::vector<std::string> texts) {
        auto const left = std::make_shared<std::deque<std::string>>(texts.begin(), texts.end());
        return [left]() -> std::optional<std::string> {
            if (left->empty())
                return std::nullopt;
            std::string text = std::move(left->front());
            left->pop_front();
            return text;
        };
    }

    void awaitKept(std::size_t wanted) {
        std::unique_lock lock(mutex);
        ASSERT_TRUE(came.wait_for(lock, 60s, [&] { return kept.size() >= wanted; }));
    }
    std::size_t keptCount() {
        std::lock_guard const guard(mutex);
        return kept.size();
    }
    void answerAll() {
        std::lock_guard const guard(mutex);
        for (Channel::DataStored const& stored : unanswered)
            stored();
        unanswered.clear();
    }
};

TEST_F(DataTravel, BringsPiecesInOrderBetweenCommands) {
    serve();
    Client client(server->clientSettings());
    EXPECT_TRUE(client.takesData());
    std::vector<std::string> texts;
    for (std::uint32_t i = 0; i < 300; ++i)
        texts.push_back(textOf(std::string(i * 300 + 1, static_cast<char>('a' + i % 20)), i));
    client.call<Ipc::PriceEst>(json::Object{});
    client.sendData(sourceOf(texts));
    client.call<Ipc::PriceEst>(json::Object{});
    client.sendData(sourceOf({}));
    client.sendData(sourceOf({texts.front()}));
    texts.push_back(texts.front());
    EXPECT_EQ(kept, texts);
}

TEST_F(DataTravel, BringsThePiecesOfALargePage) {
    serve();
    Client client(server->clientSettings());
    std::vector<std::string> texts;
    std::string const piece(MAX_PIECE, 'x');
    for (std::uint64_t i = 0; i < 40; ++i)
        texts.push_back(Channel::printData({"p1", 0, "d", "1", 40 * MAX_PIECE, i * MAX_PIECE, piece}));
    client.sendData(sourceOf(texts));
    EXPECT_TRUE(kept == texts);
}

TEST_F(DataTravel, IsNotForServicesThatDoNotTakeIt) {
    RunningServer const none;
    Client client(none.clientSettings());
    EXPECT_FALSE(client.takesData());
    EXPECT_EQ(failureOf([&] { client.sendData(sourceOf({textOf("x")})); }),
              "The service takes no data on this connection.");
    client.call<Ipc::PriceEst>(json::Object{});
}

TEST_F(DataTravel, TellsWhyDataIsRefusedAndGoesOn) {
    serve();
    refusal = "The disk is full.";
    Client client(server->clientSettings());
    EXPECT_EQ(failureOf([&] {
                  client.sendData(sourceOf(std::vector<std::string>(200, textOf(std::string(50000, 'x')))));
              }),
              "The service refuses: The disk is full.");
    EXPECT_TRUE(client.isOpen());
    client.call<Ipc::PriceEst>(json::Object{});
    refusal.clear();
    std::size_t const before = keptCount();
    client.sendData(sourceOf({textOf("more")}));
    EXPECT_EQ(keptCount(), before + 1);
}

TEST_F(DataTravel, PassesOverWhatComesBehindRefusedDataUntilTheNextRequest) {
    serve();
    refusal = "No.";
    RawPeer peer(server->port());
    peer.greet(Channel::VERSION);
    for (std::uint32_t sequence : {2u, 3u, 4u})
        peer.send(Channel::PACK_DATA, Kind::Data, sequence, textOf("x"));
    EXPECT_EQ(peer.receive().value().sequence, 2u);
    peer.send(PRICE, Kind::Request, 5, "{}");
    EXPECT_EQ(peer.receive().value().sequence, 5u);
    EXPECT_EQ(kept.size(), 1u);
}

TEST_F(DataTravel, EndsTheConnectionWhenTheSourceFails) {
    serve();
    Client client(server->clientSettings());
    int pieces = 0;
    EXPECT_THROW(client.sendData([&]() -> std::optional<std::string> {
        if (++pieces > 2)
            throw std::out_of_range("the file is gone");
        return textOf("x");
    }),
                 std::out_of_range);
    EXPECT_FALSE(client.isOpen());
}

TEST_F(DataTravel, HasNoMoreUnderWayThanItsWindow) {
    answersAtOnce = false;
    serve();
    std::atomic<std::size_t> given = 0;
    std::thread sender([&] {
        Client client(server->clientSettings());
        client.sendData([&]() -> std::optional<std::string> {
            return given < 100 ? std::optional(
                                     textOf(std::string(MAX_PIECE, 'x'), static_cast<std::uint32_t>(given++)))
                               : std::nullopt;
        });
    });
    std::size_t const window = Channel::DATA_WINDOW / Channel::MAX_DATA_TEXT;
    awaitKept(window);
    EXPECT_LE(given, window + 1);
    while (given < 100) {
        answerAll();
        std::this_thread::yield();
    }
    while (keptCount() < 100)
        std::this_thread::yield();
    answerAll();
    sender.join();
    EXPECT_EQ(kept.size(), 100u);
}

TEST_F(DataTravel, GivesUpAServiceThatDoesNotStoreIt) {
    answersAtOnce = false;
    serve();
    Channel::ClientSettings settings = server->clientSettings();
    settings.requestTime = [](Ipc::Timeouts::TimeoutId) { return 100ms; };
    Client client(settings);
    EXPECT_THAT(failureOf([&] { client.sendData(sourceOf({textOf("x")})); }),
                EndsWith(": It gives no answer within 0.100 s."));
    EXPECT_FALSE(client.isOpen());
}

// --- hostile clients

TEST_F(DataTravel, ClosesClientsThatSendMoreAtOnceThanTheyMay) {
    answersAtOnce = false;
    serve();
    RawPeer peer(server->port());
    peer.greet(Channel::VERSION);
    std::string const text = textOf(std::string(MAX_PIECE, 'x'));
    for (std::uint32_t i = 0; i <= Channel::DATA_WINDOW / text.size(); ++i)
        peer.send(Channel::PACK_DATA, Kind::Data, 2 + i, text);
    EXPECT_EQ(peer.refusal(), "It sends more data at once than it may.");
    answerAll();
}

struct BadData {
    char const* name;
    int command;
    std::string text;
    std::string reason;
};

class BadDataMessages : public DataTravel, public WithParamInterface<BadData> {};

TEST_P(BadDataMessages, EndTheConnection) {
    serve();
    RawPeer peer(server->port());
    peer.greet(Channel::VERSION);
    peer.send(GetParam().command, Kind::Data, 2, GetParam().text);
    EXPECT_EQ(peer.refusal(), GetParam().reason);
    EXPECT_TRUE(log.hasLogged(GetParam().reason));
    EXPECT_THAT(kept, IsEmpty());
}

INSTANTIATE_TEST_SUITE_P(
    Texts, BadDataMessages,
    Values(BadData{"NoNames", 25, "\5p1", "A data message ends before its names do."},
           BadData{"NoText", 25, "", "A data message ends before its names do."},
           BadData{"NoBytes", 25, textOf("x").substr(0, textOf("x").size() - 1),
                   "A data message holds 0 bytes of a page, and 1 to 1048576 is what it may."},
           BadData{"MoreBytesThanThePage", 25, textOf("x") + "y", BEHIND_THE_END},
           BadData{"AnotherCommand", 24, textOf("x"), "This service takes no such data."}),
    [](auto const& instance) { return instance.param.name; });

TEST_F(DataTravel, ServesOthersWhileAClientTakesNoNotice) {
    Channel::ServerSettings settings = patient();
    settings.messageTime = 300ms;
    serve(settings);
    RawPeer deaf(server->port());
    deaf.greet(Channel::VERSION);
    std::string bytes;
    std::uint32_t sequence = 2;
    // It never reads what it is told; in the end that fills what the system keeps for it.
    while (!log.hasLoggedYet("It does not take its answer.")) {
        try {
            deaf.send(Channel::PACK_DATA, Kind::Data, sequence++, textOf("x"));
        } catch (std::exception const&) {
            break;
        }
    }
    Client client(server->clientSettings());
    client.call<Ipc::PriceEst>(json::Object{});
    EXPECT_TRUE(server->hasConnections(1));
}

TEST_F(DataTravel, SharesTheMemoryOfAllAndWaitsForIt) {
    answersAtOnce = false;
    Channel::ServerSettings settings = patient();
    settings.requestMemory = 2 * MAX_PIECE;
    serve(settings);
    RawPeer first(server->port());
    RawPeer second(server->port());
    std::string const text = textOf(std::string(MAX_PIECE - 1000, 'x'));
    for (RawPeer* const peer : {&first, &second}) {
        peer->greet(Channel::VERSION);
        peer->send(Channel::PACK_DATA, Kind::Data, 2, text);
    }
    awaitKept(2);
    // Small ones count, too.
    first.send(Channel::PACK_DATA, Kind::Data, 3, textOf(std::string(60'000, 'y')));
    second.send(PRICE, Kind::Request, 3, "{}");
    EXPECT_EQ(second.receive().value().kind, Kind::Response);
    EXPECT_EQ(keptCount(), 2u);
    answerAll();
    awaitKept(3);
}

TEST_F(DataTravel, LosesNothingThatOthersMayHaveWhenClientsVanish) {
    answersAtOnce = false;
    Channel::ServerSettings settings = patient();
    settings.requestMemory = MAX_PIECE;
    serve(settings);
    for (int i = 0; i < 5; ++i) {
        RawPeer peer(server->port());
        peer.greet(Channel::VERSION);
        peer.send(Channel::PACK_DATA, Kind::Data, 2, textOf(std::string(900'000, 'x')));
        awaitKept(static_cast<std::size_t>(i) + 1);
        peer.vanish();
        ASSERT_TRUE(server->hasConnections(0));
        answerAll();
    }
}

TEST_F(DataTravel, BreaksOffAnywhereWithoutHarm) {
    serve();
    std::string const message = bytesOf(Channel::PACK_DATA, Kind::Data, 2, textOf("x"));
    for (std::size_t length = 1; length < message.size(); ++length) {
        RawPeer peer(server->port());
        peer.greet(Channel::VERSION);
        peer.send(message.substr(0, length));
        peer.finish();
        EXPECT_EQ(peer.refusal(), "The connection ended in the middle of a message.") << length;
    }
    EXPECT_THAT(kept, IsEmpty());
    EXPECT_TRUE(server->hasConnections(0));
}

// --- broken services

TEST(DataToBrokenServices, FailsWithTheConnection) {
    FakeService service([](RawPeer& peer) {
        peer.welcome(Channel::VERSION, R"({"data":true})");
        std::uint32_t const sequence = peer.receive().value().sequence;
        peer.send(Channel::PACK_DATA, Kind::Stored, sequence - 1, "");
        while (peer.receive()) {
        }
    });
    Client client(service.clientSettings());
    EXPECT_EQ(failureOf([&] { client.sendData([] { return std::optional(textOf("x")); }); }),
              service.name() + ": It answers what was not asked.");
    EXPECT_FALSE(client.isOpen());
}

TEST(DataToBrokenServices, FailsWhenTheyBreakOffBehindAnyPiece) {
    for (int pieces = 0; pieces < 4; ++pieces) {
        FakeService service([pieces](RawPeer& peer) {
            peer.welcome(Channel::VERSION, R"({"data":true})");
            for (int i = 0; i < pieces; ++i)
                peer.send(Channel::PACK_DATA, Kind::Stored, peer.receive().value().sequence, "");
        });
        Client client(service.clientSettings());
        EXPECT_THROW(client.sendData([] { return std::optional(textOf("x")); }), Base::Error);
        EXPECT_FALSE(client.isOpen());
    }
}

} // namespace
