#include "programs/database/sqlite_connection.h"
#include "programs/vlserviced/jobs/pack_reception.h"

#include "programs/base/error.h"
#include "programs/vlserviced/store/schema.h"
#include "tests/support/coded_lines.h"
#include "tests/support/failure_of.h"
#include "tests/support/small_disk.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/sent_pack.h"

#include <SQLiteCpp/Statement.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <deque>
#include <fstream>
#include <iterator>

namespace {

namespace fs = std::filesystem;

using testing::HasSubstr;
using VlServiced::JobState;
using VlServiced::KeptPack;
using VlServiced::PackReception;

struct NoProcessor : Ipc::CmdProcessorI {
    void submit(std::shared_ptr<Ipc::CmdI>) override {}
};

std::string bytesIn(fs::path const& file) {
    std::ifstream in(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
}

/// What the store's thread does is done at once, or when the test says so.
class PackReceptionTest : public testing::Test {
protected:
    PackReceptionTest() { open(file_); }

    using Connection = std::shared_ptr<NoProcessor>;

    void open(fs::path const& file, std::function<void(std::function<void()>)> const& soon = {}) {
        store_ = VlServiced::openSqlitePackStore(file);
        reception_.emplace(store_, jobs_,
                           VlServiced::ReceptionSurroundings{
                               [this](std::function<void()> work) {
                                   work_.push_back(std::move(work));
                                   if (worksAtOnce_)
                                       doWork();
                               },
                               [](std::function<void()> const& work) { work(); },
                               [this] { return now_; },
                               [this](std::string const&) { return quota_; },
                               [](std::string const& node) { return node == "a=closed"; },
                               soon,
                           });
    }
    void doWork() {
        if (isWorking_)
            return;
        isWorking_ = true;
        for (; !work_.empty(); work_.pop_front())
            work_.front()();
        isWorking_ = false;
    }

    /// How many pages are there, "accepted", or the line.
    std::string begin(SentPack const& pack, Connection const& connection) {
        std::string told = "never told";
        reception_->begin(pack.head, connection,
                          [&](Protocol::BeginPackAnswer const& answer, std::string const& failure) {
                              told = !failure.empty()    ? failure
                                     : answer.isAccepted ? "accepted"
                                                         : std::to_string(answer.have);
                          });
        return told;
    }
    std::string begin(SentPack const& pack) { return begin(pack, connection_); }
    /// The line of what is wrong with a piece, or nothing.
    std::string send(std::string const& text, Connection const& connection) {
        std::string told = "never told";
        reception_->take(connection, text, [&](std::string const& failure) { told = failure; });
        return told;
    }
    std::string send(std::string const& text) { return send(text, connection_); }
    void sendAll(SentPack const& pack) {
        for (std::size_t i = 0; i < pack.pages.size(); ++i)
            EXPECT_EQ(send(pack.text(i)), "");
    }
    std::string complete(std::string const& packId) {
        std::string told = "never told";
        reception_->complete(packId, [&](std::string const& failure) { told = failure; });
        return told;
    }
    std::string stateOf(std::string const& packId) {
        std::optional<KeptPack> const kept = store_->find(packId);
        return !kept                                      ? "none"
               : kept->state == KeptPack::State::Open     ? "open"
               : kept->state == KeptPack::State::Complete ? "complete"
                                                          : "erased";
    }
    long long rowsIn(char const* table) {
        return SQLite::Database(file_, SQLite::OPEN_READONLY)
            .execAndGet(std::string("SELECT count(*) FROM ") + table)
            .getInt64();
    }
    void accept(std::string const& packId, JobState state) {
        VlServiced::Job job;
        job.pack = {Protocol::OVER_CONNECTION, Protocol::PACKS_OF_CONNECTION, packId};
        jobs_.accept(job);
        if (state != JobState::Accepted)
            jobs_.advance(packId, JobState::Accepted, state, now_);
    }

    TemporaryFolder folder_;
    fs::path file_ = folder_ / "packs.db";
    Database::SqliteConnection database_{
        Database::openDatabase(":memory:", VlServiced::serviceDatabase(), Database::Journal::Rollback)};
    VlServiced::JobStore jobs_{database_};
    std::shared_ptr<VlServiced::PackStore> store_;
    std::deque<std::function<void()>> work_;
    bool worksAtOnce_ = true;
    bool isWorking_ = false;
    long long now_ = 1'000'000;
    std::optional<long long> quota_;
    Connection connection_ = std::make_shared<NoProcessor>();
    std::optional<PackReception> reception_;
};

constexpr auto NOT_ITS_OWN =
    "pack p1 is none that this connection sends: another one goes on with it, or nobody has begun it";

TEST_F(PackReceptionTest, KeepsAPackAsItWasSent) {
    SentPack const pack("p1");
    EXPECT_EQ(begin(pack), "0");
    sendAll(pack);
    EXPECT_EQ(stateOf("p1"), "open");
    EXPECT_EQ(complete("p1"), "");
    EXPECT_EQ(stateOf("p1"), "complete");
    auto const read = store_->open("p1");
    EXPECT_EQ(read->info(), (Mailing::PackInfo{"p1", "a=acme", "Title of p1"}));
    ASSERT_EQ(read->pages().size(), 3u);
    EXPECT_EQ(read->documentCount(), 2u);
    EXPECT_EQ(unzipped(Mailing::pageOf(*read, read->pages()[1])), "second page of p1");
    EXPECT_EQ(unzipped(read->metadata()), metadataText("p1"));
    EXPECT_TRUE(Mailing::pageOf(*read, {"one.pdf", "7"}).empty());
    EXPECT_EQ(complete("p1"), "") << "once more changes nothing";
}

TEST_F(PackReceptionTest, PutsPagesTogetherOfPiecesOfAnySize) {
    SentPack pack("p1");
    for (std::size_t length = 3; length < 40; ++length) {
        ASSERT_EQ(begin(pack), "0");
        for (std::size_t i = 0; i < pack.pages.size(); ++i)
            for (std::size_t offset = 0; offset < pack.pages[i].blob.size(); offset += length)
                ASSERT_EQ(send(pack.text(i, offset, length)), "") << length;
        ASSERT_EQ(complete("p1"), "");
        EXPECT_EQ(unzipped(store_->open("p1")->metadata()), metadataText("p1"));
        store_->eraseSome("p1");
        store_->forget("p1");
    }
}

TEST_F(PackReceptionTest, GoesOnBehindThePagesThatAreThere) {
    SentPack const pack("p1");
    begin(pack);
    send(pack.text(0));
    send(pack.text(1, 0, 5));
    EXPECT_EQ(begin(pack), "1") << "a page that is there in part comes anew";
    EXPECT_EQ(rowsIn("pieces"), 1);
    open(file_);
    EXPECT_EQ(begin(pack), "1") << "as behind a start of the service";
    for (std::size_t i = 1; i < pack.pages.size(); ++i)
        EXPECT_EQ(send(pack.text(i)), "");
    open(file_);
    EXPECT_EQ(complete("p1"), "") << "also when it is asked for behind a start";
    EXPECT_EQ(begin(pack), "4");
}

TEST_F(PackReceptionTest, TakesAllThatCameMeanwhileAtOnce) {
    SentPack const pack("p1");
    SentPack const other("p2");
    begin(pack);
    begin(other);
    worksAtOnce_ = false;
    std::vector<std::string> told;
    for (std::size_t i = 0; i < pack.pages.size(); ++i)
        for (SentPack const* each : {&pack, &other})
            reception_->take(connection_, each->text(i), [&, each](std::string const& failure) {
                told.push_back(each->head.id + failure);
            });
    EXPECT_EQ(work_.size(), 1u);
    doWork();
    EXPECT_THAT(told, testing::ElementsAre("p1", "p1", "p1", "p1", "p2", "p2", "p2", "p2"))
        << "the first alone, then those that waited, pack by pack";
    worksAtOnce_ = true;
    EXPECT_EQ(complete("p1"), "");
    EXPECT_EQ(complete("p2"), "");
}

/// Pieces go to the disk when a test says that some time has passed.
class PackReceptionWithTime : public PackReceptionTest {
protected:
    PackReceptionWithTime() {
        open(file_, [this](std::function<void()> work) { reminders_.push_back(std::move(work)); });
        begin(pack_);
    }
    void take(std::string const& text) {
        reception_->take(connection_, text, [this](std::string const& failure) { told_.push_back(failure); });
    }
    void letTimePass() {
        for (auto const& work : std::exchange(reminders_, {}))
            work();
    }

    SentPack pack_{"p1"};
    std::vector<std::function<void()>> reminders_;
    std::vector<std::string> told_;
};

TEST_F(PackReceptionWithTime, PutsPiecesOnTheDiskAtOnceThatComeOneUponTheOther) {
    take(pack_.text(0));
    take(pack_.text(1));
    EXPECT_THAT(told_, testing::IsEmpty());
    EXPECT_EQ(reminders_.size(), 1u);
    letTimePass();
    EXPECT_THAT(told_, testing::ElementsAre("", ""));
    take(pack_.text(2));
    EXPECT_EQ(told_.size(), 2u);
    EXPECT_EQ(reminders_.size(), 1u);
}

TEST_F(PackReceptionWithTime, LetsTheEndOfAPackWaitForNothing) {
    for (std::size_t i = 0; i < pack_.pages.size(); ++i)
        take(pack_.text(i));
    EXPECT_THAT(told_, testing::ElementsAre("", "", "", ""));
    EXPECT_EQ(complete("p1"), "");
}

TEST_F(PackReceptionWithTime, LetsNothingWaitThatIsEnoughForATransaction) {
    pack_ = SentPack("p2");
    pack_.pages.front().blob.resize(5 * Channel::MAX_PIECE, 'x');
    pack_.settle();
    begin(pack_);
    for (std::size_t piece = 0; piece < 3; ++piece)
        take(pack_.text(0, piece * Channel::MAX_PIECE, Channel::MAX_PIECE));
    EXPECT_THAT(told_, testing::IsEmpty());
    take(pack_.text(0, 3 * Channel::MAX_PIECE, Channel::MAX_PIECE));
    EXPECT_THAT(told_, testing::ElementsAre("", "", "", ""));
    letTimePass();
    EXPECT_EQ(told_.size(), 4u);
}

TEST_F(PackReceptionWithTime, LooksWhetherAPackIsWholeBehindWhatWaits) {
    for (std::size_t i = 0; i + 1 < pack_.pages.size(); ++i)
        take(pack_.text(i));
    EXPECT_EQ(complete("p1"),
              "pack p1 is not whole: page 4 of 4 is missing, counting its metadata [mailing-damaged]");
    EXPECT_THAT(told_, testing::ElementsAre("", "", ""));
}

TEST_F(PackReceptionTest, LetsWhoBeganLastGoOn) {
    SentPack const pack("p1");
    auto const second = std::make_shared<NoProcessor>();
    EXPECT_EQ(send(pack.text(0)), NOT_ITS_OWN);
    begin(pack);
    EXPECT_EQ(send(pack.text(0), second), NOT_ITS_OWN);
    EXPECT_EQ(send(pack.text(0)), "");
    EXPECT_EQ(begin(pack, second), "1");
    EXPECT_EQ(send(pack.text(1)), NOT_ITS_OWN);
    EXPECT_EQ(send(pack.text(1), second), "");
    EXPECT_EQ(stateOf("p1"), "open") << "what a stranger sends does no harm to it";
}

TEST_F(PackReceptionTest, DropsWhatTheFormerConnectionHasSentWhenAnotherGoesOn) {
    SentPack const pack("p1");
    auto const second = std::make_shared<NoProcessor>();
    begin(pack);
    worksAtOnce_ = false;
    std::vector<std::string> told;
    for (std::size_t i = 0; i < 3; ++i)
        reception_->take(connection_, pack.text(i),
                         [&](std::string const& failure) { told.push_back(failure); });
    std::string have;
    reception_->begin(pack.head, second, [&](Protocol::BeginPackAnswer const& answer, std::string const&) {
        have = std::to_string(answer.have);
    });
    doWork();
    EXPECT_THAT(told, testing::ElementsAre(NOT_ITS_OWN, NOT_ITS_OWN, ""));
    EXPECT_EQ(have, "1") << "what was on its way to the disk is there";
    worksAtOnce_ = true;
    for (std::size_t i = 1; i < pack.pages.size(); ++i)
        EXPECT_EQ(send(pack.text(i), second), "");
    EXPECT_EQ(complete("p1"), "");
}

TEST_F(PackReceptionTest, LosesNoPackThatIsCompleteToBadData) {
    SentPack const pack("p1");
    begin(pack);
    sendAll(pack);
    complete("p1");
    EXPECT_EQ(begin(pack), "4");
    EXPECT_EQ(send(pack.text(2)), "pack p1 is none that pages are wanted of [state-refused]");
    EXPECT_EQ(stateOf("p1"), "complete");
    accept("p1", JobState::Accepted);
    EXPECT_EQ(send(pack.text(2)), "pack p1 is none that pages are wanted of [state-refused]");
    EXPECT_EQ(unzipped(store_->open("p1")->metadata()), metadataText("p1"));
}

TEST_F(PackReceptionTest, AnswersWhoOnlyAsksWithoutAnyChange) {
    SentPack pack("p1");
    begin(pack);
    send(pack.text(0));
    pack.head.asks = true;
    EXPECT_EQ(begin(pack, std::make_shared<NoProcessor>()), "1");
    EXPECT_EQ(send(pack.text(1, 0, 10)), "") << "who sends it goes on sending it";
    EXPECT_EQ(begin(pack), "1");
    EXPECT_EQ(rowsIn("pieces"), 2);
    SentPack unknown("p2");
    unknown.head.asks = true;
    EXPECT_EQ(begin(unknown), "0");
    EXPECT_EQ(stateOf("p2"), "none");
}

TEST_F(PackReceptionTest, TakesNoOtherPackUnderTheSameId) {
    SentPack const pack("p1");
    begin(pack);
    SentPack other("p1");
    other.pages[0].blob += 'x';
    other.settle();
    constexpr auto OTHER =
        "there is another pack p1 with other pages: give this one an id of its own [mailing-exists]";
    EXPECT_EQ(begin(other), OTHER);
    sendAll(pack);
    EXPECT_EQ(complete("p1"), "");
    EXPECT_EQ(begin(other), OTHER);
    accept("p1", JobState::Accepted);
    EXPECT_EQ(begin(pack), "accepted");
    EXPECT_EQ(begin(other), OTHER);
    jobs_.advance("p1", JobState::Accepted, JobState::Submitted, now_);
    reception_->onJobChanged("p1");
    EXPECT_EQ(begin(pack), "accepted");
    EXPECT_EQ(begin(other), OTHER) << "its digest is known as long as its job is";
}

TEST_F(PackReceptionTest, TakesNoPackOfTheIdOfALocalOne) {
    VlServiced::Job job;
    job.pack = {"/srv/packs", "packs.db", "p1"};
    jobs_.accept(job);
    EXPECT_EQ(begin(SentPack("p1")),
              "there is another pack p1 with other pages: give this one an id of its own [mailing-exists]");
}

TEST_F(PackReceptionTest, RefusesBeginningsThatSayNoPack) {
    auto const refusal = [&](auto change) {
        SentPack pack("p1");
        change(pack.head);
        return begin(pack);
    };
    using Head = Protocol::BeginPack;
    EXPECT_EQ(refusal([](Head& head) { head.id = "../p1"; }),
              "the pack id \"../p1\" cannot name a file [mailing-id-invalid]");
    EXPECT_EQ(refusal([](Head& head) { head.title = "a\nb"; }),
              "the title of pack p1 is not a line of text of at most 500 bytes [mailing-invalid]");
    EXPECT_THAT(refusal([](Head& head) { head.cfgId = "acme"; }), HasSubstr("node id \"acme\" is not valid"));
    EXPECT_EQ(refusal([](Head& head) { head.pages = 0; }), "pack p1 has no pages [mailing-invalid]");
    EXPECT_EQ(refusal([](Head& head) { head.sha256 = "x"; }),
              "the digest of pack p1 is none of 64 hexadecimal digits [mailing-invalid]");
    EXPECT_EQ(refusal([](Head& head) { head.cfgId = "a=closed"; }),
              "node a=closed is disabled: pack p1 is not taken [node-disabled]");
    EXPECT_EQ(stateOf("p1"), "none");
}

TEST_F(PackReceptionTest, HoldsTheQuotaOfANode) {
    SentPack large("p2");
    large.add("more.pdf", "1", std::string(1, 'x'));
    std::swap(large.pages[3], large.pages[4]);
    large.settle();
    quota_ = 2LL << 20;
    EXPECT_EQ(begin(SentPack("p1")), "0");
    large.head.bytes = 2LL << 20;
    EXPECT_EQ(begin(large),
              "node a=acme may have 2 MiB of packs with the service at once, and has 1 MiB: pack "
              "p2 of 2 MiB is not taken before some of them were handed over [quota-exceeded]");
    EXPECT_EQ(stateOf("p2"), "none");
    accept("p1", JobState::Submitted);
    reception_->onJobChanged("p1");
    EXPECT_EQ(begin(large), "0") << "what is handed over counts no more";
    SentPack other("p3", "a=other");
    EXPECT_EQ(begin(other), "0") << "each node has its own";
    quota_ = 0;
    EXPECT_THAT(begin(SentPack("p4", "a=third")), HasSubstr("may have 0 MiB"));
}

/// Pieces of which one is wrong.
struct Wrong {
    char const* name;
    std::function<std::string(SentPack&)> piece;
    char const* reason;
};

class WrongPieces : public PackReceptionTest, public testing::WithParamInterface<Wrong> {};

TEST_P(WrongPieces, EndTheirPackAndLeaveNothing) {
    SentPack pack("p1");
    std::string const wrong = GetParam().piece(pack);
    ASSERT_EQ(begin(pack), "0");
    ASSERT_EQ(send(pack.text(0)), "");
    EXPECT_EQ(wordsOf(send(wrong)), wordsOf(GetParam().reason));
    EXPECT_EQ(stateOf("p1"), "erased");
    EXPECT_EQ(rowsIn("pages") + rowsIn("pieces"), 0);
    EXPECT_EQ(send(pack.text(1)), "pack p1 is none that pages are wanted of [state-refused]");
    EXPECT_EQ(complete("p1"), "the service has no pack p1: send it again [mailing-unknown]");
    EXPECT_EQ(begin(pack), "0") << "it may come anew";
}

std::string pieceOf(std::uint32_t position, std::string_view document, std::string_view page,
                    std::uint64_t size, std::string_view bytes, std::uint64_t offset = 0) {
    return Channel::printData({"p1", position, document, page, size, offset, bytes});
}

INSTANTIATE_TEST_SUITE_P(
    Pieces, WrongPieces,
    testing::Values(
        Wrong{"AGap", [](SentPack& pack) { return pack.text(2); },
              "page 3 of pack p1 comes where page 2 is wanted [mailing-damaged]"},
        Wrong{"APageThatIsThere", [](SentPack& pack) { return pack.text(0); },
              "page 1 of pack p1 comes where page 2 is wanted [mailing-damaged]"},
        Wrong{"ThePageOfAnotherName",
              [](SentPack&) { return pieceOf(1, "one.pdf", "1", 20, "TEZ45678901234567890"); },
              "a page of it comes twice [database-failed]"},
        Wrong{"NoBlobHeader", [](SentPack&) { return pieceOf(1, "a", "1", 20, "TEX45678901234567890"); },
              "page 2 of pack p1 is not a compressed page"},
        Wrong{"NothingButTheBlobHeader", [](SentPack&) { return pieceOf(1, "a", "1", 11, "TEZ45678901"); },
              "page 2 of pack p1 is not a compressed page"},
        Wrong{"APageOverTheLimit",
              [](SentPack& pack) {
                  pack.head.bytes = 1LL << 30;
                  return pieceOf(1, "a", "1", (256ULL << 20) + 1, "TEZ456789012");
              },
              "page 2 of pack p1 has 268435457 bytes, and 256 MiB is the most [mailing-damaged]"},
        Wrong{
            "MoreThanWasSaid", [](SentPack&) { return pieceOf(1, "a", "1", 1 << 20, "TEZ456789012"); },
            "page 2 of pack p1 is more than the 250 bytes that the pack was said to have [mailing-damaged]"},
        Wrong{"TheMetadataTooEarly", [](SentPack&) { return pieceOf(1, "", "", 20, "TEZ45678901234567890"); },
              "page 2 of pack p1 has no name [mailing-damaged]"},
        Wrong{"ANameThatNoContainerHolds",
              [](SentPack&) { return pieceOf(1, "a\x01", "1", 20, "TEZ45678901234567890"); },
              "page 2 of pack p1 has a name that a container cannot hold [mailing-damaged]"},
        Wrong{"TheMiddleOfAPage", [](SentPack& pack) { return pack.text(1, 5); },
              "page 2 of pack p1 is not a compressed page"}),
    [](auto const& instance) { return instance.param.name; });

TEST_F(PackReceptionTest, RefusesAPageThatDoesNotGoOnWhereItWas) {
    SentPack const pack("p1");
    for (std::string const& second : {pack.text(0, 6), pack.text(0, 4), pack.text(0)}) {
        begin(pack);
        send(pack.text(0, 0, 5));
        EXPECT_EQ(send(second), "page 1 of pack p1 does not go on where it was [mailing-damaged]");
    }
}

TEST_F(PackReceptionTest, RefusesPagesBehindTheMetadata) {
    SentPack pack("p1");
    pack.head.bytes += 100;
    begin(pack);
    sendAll(pack);
    EXPECT_EQ(send(pieceOf(4, "a", "1", 20, "TEZ45678901234567890")),
              "page 5 of pack p1 is more than the 3 pages that the pack was said to have [mailing-damaged]");
}

TEST_F(PackReceptionTest, RefusesWhatIsNotWholeOrNotWhatWasSaidAndKeepsNothing) {
    SentPack pack("p1");
    begin(pack);
    send(pack.text(0));
    EXPECT_EQ(complete("p1"),
              "pack p1 is not whole: page 2 of 4 is missing, counting its metadata [mailing-damaged]");
    EXPECT_EQ(rowsIn("pages") + rowsIn("pieces"), 0);
    pack.head.sha256 = std::string(64, '0');
    EXPECT_EQ(begin(pack), "0");
    sendAll(pack);
    EXPECT_EQ(complete("p1"),
              "pack p1 is not what it was said to be: its digest is another [mailing-damaged]");
    EXPECT_EQ(rowsIn("pages") + rowsIn("pieces"), 0);
    EXPECT_EQ(complete("p9"), "the service has no pack p9: send it again [mailing-unknown]");
}

TEST_F(PackReceptionTest, KeepsNothingWhenTheDiskIsFull) {
    fs::create_directory(folder_ / "small");
    VLServiceTest::MountedDisk const disk((folder_ / "small").string(), "size=16m");
    if (!disk.whyNot().empty())
        GTEST_SKIP() << "no right to mount a small disk: " << disk.whyNot();
    open(folder_ / "small/packs.db");
    SentPack pack("p1");
    std::string noise;
    for (unsigned i = 0; i < 16 << 20; ++i)
        noise += static_cast<char>((i * 2654435761U) >> 24);
    pack.pages[1].blob = "TEZ" + noise;
    pack.settle();
    ASSERT_EQ(begin(pack), "0");
    ASSERT_EQ(send(pack.text(0)), "");
    ASSERT_EQ(send(pack.text(1, 0, 100'000)), "");
    std::string reason;
    for (std::size_t offset = 100'000; offset < pack.pages[1].blob.size() && reason.empty();
         offset += 100'000)
        reason = send(pack.text(1, offset, 100'000));
    EXPECT_EQ(reason,
              "there is no room on the disk of the service: make room and send it again [database-failed]");
    EXPECT_EQ(stateOf("p1"), "erased");
    EXPECT_EQ(begin(SentPack("p2")), "0") << "there is room again";
    SentPack const small("p2");
    sendAll(small);
    EXPECT_EQ(complete("p2"), "");
}

// --- of several services with one store

/// A service of its own, on the same store.
class OtherReception {
public:
    OtherReception(fs::path const& file, VlServiced::JobStore& jobs)
        : reception_(VlServiced::openSqlitePackStore(file), jobs,
                     {[](std::function<void()> const& work) { work(); },
                      [](std::function<void()> const& work) { work(); }, [] { return 1000; },
                      [](std::string const&) { return std::optional<long long>(); },
                      [](std::string const&) { return false; }}) {}

    long long begin(SentPack const& pack) {
        long long have = -1;
        reception_.begin(
            pack.head, connection_,
            [&](Protocol::BeginPackAnswer const& answer, std::string const&) { have = answer.have; });
        return have;
    }
    std::string send(std::string const& text) {
        std::string told = "never told";
        reception_.take(connection_, text, [&](std::string const& failure) { told = failure; });
        return told;
    }
    std::string complete(std::string const& packId) {
        std::string told = "never told";
        reception_.complete(packId, [&](std::string const& failure) { told = failure; });
        return told;
    }

private:
    std::shared_ptr<NoProcessor> connection_ = std::make_shared<NoProcessor>();
    PackReception reception_;
};

constexpr char const* GONE_ON_WITH =
    "pack p1 is none that this connection sends: another one goes on with it "
    "[lease-lost]";

TEST_F(PackReceptionTest, TakesWhatAServiceStillHasOfAPackForNothingThatAnotherOneGoesOnWith) {
    SentPack const pack("p1");
    OtherReception other(file_, jobs_);
    begin(pack);
    EXPECT_EQ(send(pack.text(0)), "");
    EXPECT_EQ(send(pack.text(1, 0, 5)), "");
    EXPECT_EQ(other.begin(pack), 1);
    EXPECT_EQ(send(pack.text(1, 5)), GONE_ON_WITH);
    EXPECT_EQ(other.send(pack.text(1, 0, 7)), "");
    EXPECT_EQ(other.send(pack.text(1, 7)), "") << "what came late has done it no harm";
    EXPECT_THAT(complete("p1"), HasSubstr("pack p1 is not whole"))
        << "whoever is asked looks at what is there";
    EXPECT_THAT(send(pack.text(2)), HasSubstr("another one goes on with it"));
    EXPECT_EQ(stateOf("p1"), "open");
    for (std::size_t i = 2; i < pack.pages.size(); ++i)
        EXPECT_EQ(other.send(pack.text(i)), "");
    EXPECT_EQ(other.complete("p1"), "");
    EXPECT_EQ(unzipped(pageOf(*store_->open("p1"), {"one.pdf", "2"})), "second page of p1");
}

TEST_F(PackReceptionTest, BeginsAPackOnceThatComesToTwoServicesAtOnce) {
    SentPack const pack("p1");
    Protocol::BeginPack const& said = pack.head;
    for (int service = 0; service < 2; ++service)
        store_->add({{said.id, said.cfgId, said.title}, said.pages, said.bytes, said.sha256}, now_);
    EXPECT_EQ(rowsIn("packs"), 1);
    EXPECT_EQ(begin(pack), "0");
}

TEST_F(PackReceptionTest, ErasesNothingOfAPackThatHasComeAnewMeanwhile) {
    SentPack const pack("p1");
    begin(pack);
    sendAll(pack);
    complete("p1");
    EXPECT_FALSE(store_->eraseMore("p1"));
    store_->forget("p1");
    store_->retire("p1", now_ - 1);
    EXPECT_EQ(stateOf("p1"), "complete");
    now_ += 100'000;
    EXPECT_EQ(complete("p1"), "") << "it is about to become a job";
    store_->retire("p1", now_ - 1);
    EXPECT_EQ(stateOf("p1"), "complete");
}

// --- what goes

TEST_F(PackReceptionTest, ErasesThePagesOfWhatWasHandedOver) {
    SentPack const pack("p1");
    for (JobState const state :
         {JobState::Submitted, JobState::Failed, JobState::Cancelled, JobState::Tried}) {
        begin(pack);
        sendAll(pack);
        complete("p1");
        accept("p1", JobState::Accepted);
        reception_->onJobChanged("p1");
        reception_->sweep();
        EXPECT_EQ(stateOf("p1"), "complete") << "it is wanted still";
        jobs_.advance("p1", JobState::Accepted, state, now_);
        reception_->onJobChanged("p1");
        EXPECT_EQ(stateOf("p1"), "erased");
        EXPECT_EQ(rowsIn("pages") + rowsIn("pieces"), 0);
        jobs_.forget("p1");
        store_->forget("p1");
    }
}

TEST_F(PackReceptionTest, ErasesWhatAnEarlierProcessLeft) {
    SentPack const pack("p1");
    begin(pack);
    sendAll(pack);
    complete("p1");
    accept("p1", JobState::Submitted);
    open(file_);
    reception_->sweep();
    EXPECT_EQ(stateOf("p1"), "erased");
    jobs_.forget("p1");
    reception_->sweep();
    EXPECT_EQ(stateOf("p1"), "erased") << "known for a day longer";
    now_ += 100'000;
    reception_->sweep();
    EXPECT_EQ(stateOf("p1"), "none");
}

TEST_F(PackReceptionTest, ErasesWhatWasNotFinishedOrNotAnnouncedWithinADay) {
    SentPack const pack("p1");
    SentPack const whole("p2");
    begin(pack);
    send(pack.text(0));
    begin(whole);
    sendAll(whole);
    complete("p2");
    now_ += 86'399;
    reception_->sweep();
    EXPECT_EQ(stateOf("p1"), "open");
    EXPECT_EQ(send(pack.text(1)), "");
    now_ += 2;
    reception_->sweep();
    EXPECT_EQ(stateOf("p1"), "open") << "something of it came meanwhile";
    EXPECT_EQ(stateOf("p2"), "none");
    now_ += 86'400;
    reception_->sweep();
    EXPECT_EQ(stateOf("p1"), "none");
    EXPECT_EQ(rowsIn("pages") + rowsIn("pieces") + rowsIn("packs"), 0);
}

TEST_F(PackReceptionTest, LeavesNoByteOfWhatItErasedInTheFile) {
    SentPack pack("p1");
    // Not compressed, so that it can be looked for.
    pack.pages[1].blob = "TEZ12345678" + std::string(100'000, 'q') + "the words of a letter";
    pack.settle();
    begin(pack);
    sendAll(pack);
    ASSERT_THAT(bytesIn(file_), HasSubstr("the words of a letter"));
    ASSERT_THAT(bytesIn(file_), HasSubstr("Title of p1"));
    complete("p1");
    auto const before = fs::file_size(file_);
    accept("p1", JobState::Submitted);
    reception_->onJobChanged("p1");
    EXPECT_THAT(bytesIn(file_), testing::Not(HasSubstr("the words of a letter")));
    EXPECT_THAT(bytesIn(file_), testing::Not(HasSubstr("qqqq")));
    EXPECT_THAT(bytesIn(file_), testing::Not(HasSubstr("one.pdf")));
    EXPECT_THAT(bytesIn(file_), testing::Not(HasSubstr("Title of p1")));
    EXPECT_FALSE(fs::exists(file_.string() + "-journal"));
    EXPECT_LT(fs::file_size(file_), before) << "the disk has its room back";
}

TEST_F(PackReceptionTest, ErasesLargePacksStepByStep) {
    SentPack pack("p1");
    for (int i = 0; i < 200; ++i)
        pack.add("many.pdf", std::to_string(i), "page");
    std::swap(pack.pages[3], pack.pages.back());
    pack.settle();
    begin(pack);
    sendAll(pack);
    complete("p1");
    accept("p1", JobState::Submitted);
    worksAtOnce_ = false;
    reception_->onJobChanged("p1");
    int steps = 0;
    for (; !work_.empty(); work_.pop_front(), ++steps)
        work_.front()();
    EXPECT_GT(steps, 3);
    EXPECT_EQ(rowsIn("pages") + rowsIn("pieces"), 0);
}

TEST_F(PackReceptionTest, NoticesAPageThatWasDamagedOnTheDisk) {
    SentPack const pack("p1");
    begin(pack);
    sendAll(pack);
    complete("p1");
    SQLite::Database(file_, SQLite::OPEN_READWRITE)
        .exec("UPDATE pieces SET data = x'54455A0000' WHERE position = 1");
    auto const read = store_->open("p1");
    EXPECT_EQ(failureOf([&] { Mailing::pageOf(*read, read->pages()[1]); }),
              "page 2 of pack p1 is damaged in the pack store of the service");
    EXPECT_EQ(failureOf([&] { store_->open("p2"); }), "the service has no finished pack p2: send it again");
}

} // namespace
