#include "programs/vlserviced/store/letter_store.h"

#include "tests/support/failure_of.h"
#include "tests/vlserviced/store_database.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;
using VlServiced::DividedLetter;
using VlServiced::Job;
using VlServiced::JobState;
using VlServiced::LetterId;
using VlServiced::LetterState;
using VlServiced::LetterStore;
using VlServiced::StoredLetter;

class LetterStoreTest : public VLServiceTest::OnEachDatabase {
protected:
    void queue(std::string const& packId) {
        Job job;
        job.pack = {"/srv", "packs.db", packId};
        jobs_.accept(job);
        jobs_.advance(packId, JobState::Accepted, JobState::Queued, 1);
    }
    void divide(std::string const& packId, std::vector<DividedLetter> const& letters) {
        queue(packId);
        EXPECT_TRUE(letters_.divide(packId, letters, 5));
    }
    std::vector<std::string> toGo(std::string const& channel, long long now, std::size_t limit = 100) {
        std::vector<std::string> keys;
        for (StoredLetter const& letter : letters_.toGo(channel, now, limit))
            keys.push_back(letter.id.key());
        return keys;
    }
    LetterState state(std::string const& packId, long long number) {
        return letters_.find({packId, number})->state;
    }

    VlServiced::JobStore jobs_{*database_};
    LetterStore letters_{*database_, jobs_};
};

TEST_P(LetterStoreTest, RecordsLettersWithTheirJobOnce) {
    divide("p1", {{1, "postal", true}, {2, "email", true}});
    EXPECT_EQ(jobs_.find("p1")->state, JobState::Delivering);
    EXPECT_TRUE(jobs_.find("p1")->isDivided);
    EXPECT_FALSE(jobs_.find("p1")->lettersState);
    EXPECT_FALSE(letters_.divide("p1", {{1, "fax", true}}, 6));
    StoredLetter const letter = letters_.find({"p1", 2}).value();
    EXPECT_EQ(letter.channel, "email");
    EXPECT_EQ(letter.state, LetterState::Waiting);
    EXPECT_EQ(letter.changedAt, 5);
    EXPECT_EQ(letters_.ofJob("p1", 100).size(), 2U);
    EXPECT_EQ(letters_.ofJob("p1", 1).size(), 1U);
    EXPECT_EQ(letters_.countOfJob("p1"), 2);
}

TEST_P(LetterStoreTest, HasALetterGoByAnotherChannelWithWhatItHasTried) {
    queue("p1");
    letters_.divide("p1", {{1, "email", true, {{"fax", false}, {"sms", true}, {"postal", true}}}}, 5);
    EXPECT_THAT(letters_.find({"p1", 1})->otherWays,
                ElementsAre(Mailing::OtherWay{"fax", false}, Mailing::OtherWay{"sms", true},
                            Mailing::OtherWay{"postal", true}));
    letters_.postpone({{"p1", 1}}, "busy", 100, 6);
    letters_.fallBack({"p1", 1}, "sms", {{"postal", true}}, "email: given up", 7);
    EXPECT_THAT(toGo("email", 1000), IsEmpty());
    EXPECT_THAT(toGo("sms", 7), ElementsAre("p1-1")) << "at once";
    EXPECT_THAT(letters_.toGoTogether("p1", "sms", 7), IsEmpty()) << "the others' file stays as it is";
    letters_.fallBack({"p1", 1}, "postal", {}, "sms: no", 8);
    StoredLetter const letter = letters_.find({"p1", 1}).value();
    EXPECT_THAT(letter.tried, ElementsAre("email", "sms"));
    EXPECT_THAT(letter.otherWays, IsEmpty());
    EXPECT_EQ(letter.attempts, 0);
    EXPECT_EQ(letter.firstTry, 0);
    EXPECT_EQ(letter.says, "sms: no");
    letters_.beginHandingOver({{"p1", 1}}, 9);
    letters_.fallBack({"p1", 1}, "fax", {}, "", 9, VlServiced::LettersAre::Waiting);
    EXPECT_EQ(letters_.find({"p1", 1})->channel, "postal");
}

TEST_P(LetterStoreTest, HoldsNoticesUntilWhatTheyTellOfIsHandedOver) {
    queue("p1");
    EXPECT_TRUE(letters_.divide("p1", {{1, "postal", true}, {2, "email", true}, {3, "fax", false}}, 5,
                                {{0, "office@acme.example"},
                                 {1, "ada@example.org", "office@acme.example", "R-17"},
                                 {3, "ben@example.org"}}));
    auto const states = [&] {
        std::string told;
        for (StoredLetter const& notice : letters_.noticesOf("p1", 100))
            told += std::string(Protocol::letterStateName(notice.state)) + ' ';
        return told;
    };
    EXPECT_EQ(letters_.countOfJob("p1"), 3);
    EXPECT_EQ(letters_.countOfNotices("p1"), 3);
    EXPECT_EQ(letters_.noticesOf("p1", 2).size(), 2U);
    EXPECT_EQ(letters_.ofJob("p1", 100).size(), 3U);
    EXPECT_THAT(toGo("email", 5), ElementsAre("p1-2"));
    EXPECT_EQ(letters_.find({"p1", -2})->notice.letter, 1);
    EXPECT_EQ(letters_.find({"p1", -2})->notice.recipient, "ada@example.org");
    EXPECT_EQ(letters_.find({"p1", -2})->notice.replyTo, "office@acme.example");
    EXPECT_EQ(letters_.find({"p1", -2})->notice.reference, "R-17");
    letters_.finish({{"p1", 1}, {"p1", 2}}, LetterState::Failed, "no", 6);
    letters_.releaseNoticesOfContainer("p1", 6);
    EXPECT_EQ(states(), "held held waiting ");
    EXPECT_TRUE(letters_.decide({"p1", 1}, {LetterState::Failed}, LetterState::Delivered, "", 7));
    letters_.releaseNoticeOfJob("p1", 7);
    EXPECT_EQ(states(), "waiting waiting waiting ");
    EXPECT_THAT(toGo("email", 7), ElementsAre("p1-n1", "p1-n2", "p1-n3"));
    EXPECT_FALSE(letters_.isUnderWay("p1")) << "notices keep no mailing on its way";
    letters_.finish({{"p1", -1}}, LetterState::Accepted, "", 8);
    EXPECT_EQ(states(), "accepted waiting waiting ");
    EXPECT_THAT(letters_.counts("p1"),
                ElementsAre(Pair(LetterState::Delivered, 1), Pair(LetterState::Failed, 1)));
}

TEST_P(LetterStoreTest, DoubtsNoticesWithAllLetters) {
    queue("p1");
    letters_.divide("p1", {{1, "postal", true}, {2, "postal", true}}, 5,
                    {{0, "office@acme.example"}, {1, "ada@example.org"}});
    letters_.finish({{"p1", 1}}, LetterState::Accepted, "", 6);
    EXPECT_EQ(letters_.doubtAll("restored", 7), 1);
    EXPECT_EQ(state("p1", 1), LetterState::Accepted);
    for (long long const number : {2, -1, -2})
        EXPECT_EQ(state("p1", number), LetterState::Uncertain) << number;
}

TEST_P(LetterStoreTest, ReleasesNoNoticeForALetterThatAnotherServiceHasDecided) {
    queue("p1");
    letters_.divide("p1", {{1, "postal", true}}, 5, {{1, "ada@example.org"}});
    letters_.beginHandingOver({{"p1", 1}}, 5);
    letters_.finish({{"p1", 1}}, LetterState::Accepted, "", 6, VlServiced::LettersAre::Waiting);
    EXPECT_EQ(state("p1", -1), LetterState::Held);
    letters_.finish({{"p1", 1}}, LetterState::Accepted, "", 6, VlServiced::LettersAre::HandedOver);
    EXPECT_EQ(state("p1", -1), LetterState::Waiting);
}

TEST_P(LetterStoreTest, LeavesAJobOnItsWayWhoseLettersAreNotAllCarried) {
    divide("p1", {{1, "postal", true}, {2, "email", false}});
    EXPECT_EQ(jobs_.find("p1")->state, JobState::Queued);
    EXPECT_EQ(jobs_.find("p1")->lettersState, JobState::Delivering);
    divide("p2", {{1, "email", false}});
    EXPECT_EQ(jobs_.find("p2")->state, JobState::Queued);
    EXPECT_FALSE(jobs_.find("p2")->lettersState);
    EXPECT_TRUE(jobs_.find("p2")->isDivided);
}

TEST_P(LetterStoreTest, DividesNothingThatIsNotQueued) {
    queue("p1");
    jobs_.hold("p1", 2);
    EXPECT_FALSE(letters_.divide("p1", {{1, "postal", true}}, 5));
    EXPECT_THAT(letters_.ofJob("p1", 100), IsEmpty());
}

TEST_P(LetterStoreTest, GivesLettersInTheOrderOfTheirTimeAndOfTheirDivision) {
    divide("p2", {{1, "postal", true}, {2, "email", true}, {3, "postal", true}});
    divide("p1", {{1, "postal", true}, {2, "postal", false}});
    EXPECT_THAT(toGo("postal", 10), ElementsAre("p2-1", "p2-3", "p1-1"));
    EXPECT_THAT(toGo("postal", 10, 2), ElementsAre("p2-1", "p2-3"));
    letters_.postpone({{"p2", 1}}, "no connection", 20, 10);
    EXPECT_THAT(toGo("postal", 10), ElementsAre("p2-3", "p1-1"));
    EXPECT_THAT(toGo("postal", 20), ElementsAre("p2-3", "p1-1", "p2-1"));
    StoredLetter const letter = letters_.find({"p2", 1}).value();
    EXPECT_EQ(letter.says, "no connection");
    EXPECT_EQ(letter.attempts, 1);
    EXPECT_EQ(letter.firstTry, 10);
    EXPECT_EQ(letter.due, 20);
    EXPECT_THAT(letters_.channelsToGo(), ElementsAre("email", "postal"));
    EXPECT_EQ(letters_.waiting("postal"), 3);
}

TEST_P(LetterStoreTest, GivesTheLettersOfAJobTogether) {
    divide("p1", {{3, "postal", true}, {1, "postal", true}, {2, "email", true}, {4, "postal", true}});
    letters_.finish({{"p1", 4}}, LetterState::Accepted, "", 9);
    std::vector<long long> numbers;
    for (StoredLetter const& letter : letters_.toGoTogether("p1", "postal", 10))
        numbers.push_back(letter.id.number);
    EXPECT_THAT(numbers, ElementsAre(1, 3));
}

TEST_P(LetterStoreTest, CountsWhatBecameOfAJobsLetters) {
    divide("p1", {{1, "postal", true}, {2, "postal", true}, {3, "postal", true}, {4, "email", false}});
    EXPECT_TRUE(letters_.isUnderWay("p1"));
    letters_.finish({{"p1", 1}, {"p1", 2}}, LetterState::Failed, "no such street", 9);
    letters_.finish({{"p1", 3}}, LetterState::Accepted, "thanks", 9);
    EXPECT_FALSE(letters_.isUnderWay("p1"));
    EXPECT_THAT(letters_.counts("p1"),
                ElementsAre(Pair(LetterState::Accepted, 1), Pair(LetterState::Failed, 2)));
    EXPECT_EQ(letters_.firstIn("p1", LetterState::Failed)->says, "no such street");
    EXPECT_FALSE(letters_.firstIn("p1", LetterState::Returned));
}

TEST_P(LetterStoreTest, LetsAPersonDecideOfCertainStatesAlone) {
    divide("p1", {{1, "postal", true}, {2, "email", false}});
    letters_.postpone({{"p1", 1}}, "busy", 50, 10);
    EXPECT_FALSE(letters_.decide({"p1", 1}, {LetterState::Failed}, LetterState::Waiting, "again", 11));
    EXPECT_FALSE(letters_.decide({"p1", 2}, {LetterState::Waiting}, LetterState::Failed, "no", 11));
    letters_.finish({{"p1", 1}}, LetterState::Failed, "given up", 12);
    EXPECT_TRUE(letters_.decide({"p1", 1}, {LetterState::Returned, LetterState::Failed}, LetterState::Waiting,
                                "again", 13));
    StoredLetter const letter = letters_.find({"p1", 1}).value();
    EXPECT_EQ(letter.says, "again");
    EXPECT_EQ(letter.attempts, 0);
    EXPECT_EQ(letter.firstTry, 0);
    EXPECT_THAT(toGo("postal", 0), ElementsAre("p1-1"));
}

TEST_P(LetterStoreTest, KeepsHowCarriersAreDoing) {
    EXPECT_FALSE(letters_.carrier("fax").isPaused);
    EXPECT_EQ(letters_.carrier("fax").failures, 0);
    letters_.setCarrier("fax", {true, 11, "no line", 70, 80});
    VlServiced::CarrierRecord const record = letters_.carrier("fax");
    EXPECT_TRUE(record.isPaused);
    EXPECT_EQ(record.failures, 11);
    EXPECT_EQ(record.says, "no line");
    EXPECT_EQ(record.since, 70);
    EXPECT_EQ(record.tryAt, 80);
}

TEST_P(LetterStoreTest, TakesNoJobForEndedWhoseLettersAreStillOnTheirWay) {
    divide("p1", {{1, "postal", true}, {2, "email", false}});
    jobs_.advance("p1", JobState::Queued, JobState::Lodged, 10);
    EXPECT_THAT(jobs_.endedBefore(1000, 10), IsEmpty());
    jobs_.setLettersState("p1", JobState::Lodged, "", 20);
    EXPECT_EQ(jobs_.endedBefore(1000, 10).size(), 1U);
}

TEST_P(LetterStoreTest, LetsLettersGoWithTheirJob) {
    divide("p1", {{1, "postal", true}});
    database_->run("DELETE FROM jobs");
    EXPECT_FALSE(letters_.find({"p1", 1}));
}

/// As SQLite has it.
class LetterStorePlans : public LetterStoreTest {};

TEST_P(LetterStorePlans, LookForWaitingLettersByTheIndexThatHoldsThem) {
    Database::Rows rows =
        database_->query("EXPLAIN QUERY PLAN SELECT * FROM letters INDEXED BY letters_to_go WHERE "
                         "channel = 'x' AND due <= 5 AND state = 'waiting' AND by_carrier = 1 "
                         "ORDER BY due, id LIMIT 3");
    std::string plan;
    while (rows.next())
        plan += rows.text(3) + '\n';
    EXPECT_EQ(plan, "SEARCH letters USING INDEX letters_to_go (channel=? AND due<?)\n");
}

TEST_P(LetterStoreTest, HasALetterHandedOverOnce) {
    divide("p1", {{1, "fax", true}, {2, "fax", true}});
    letters_.beginHandingOver({{"p1", 2}}, 6);
    EXPECT_EQ(failureOf([&] {
                  letters_.beginHandingOver({{"p1", 1}, {"p1", 2}}, 7);
              }),
              "another service may have handed over letter p1-2");
    EXPECT_EQ(state("p1", 1), LetterState::Waiting);
    EXPECT_EQ(state("p1", 2), LetterState::HandedOver);
}

TEST_P(LetterStoreTest, GivesAChannelIntoOnePairOfHandsWhereServicesShareIt) {
    divide("p1", {{1, "fax", true}, {2, "fax", true}, {3, "sms", true}});
    std::unique_ptr<Database::Connection> const connection = open();
    VlServiced::JobStore jobs(*connection, {"other", 60});
    LetterStore other(*connection, jobs);
    EXPECT_TRUE(letters_.holdChannel("fax", "ended", 6));
    EXPECT_TRUE(letters_.holdChannel("fax", "ended", 6));
    EXPECT_EQ(other.holdChannel("fax", "ended", 6), !isPostgres());
    EXPECT_TRUE(other.holdChannel("sms", "ended", 6));
    letters_.beginHandingOver({{"p1", 1}}, 7);
    database_->run("UPDATE carriers SET held_until = 0");
    EXPECT_TRUE(other.holdChannel("fax", "ended", 8));
    EXPECT_EQ(state("p1", 1), isPostgres() ? LetterState::Uncertain : LetterState::HandedOver);
    EXPECT_EQ(state("p1", 2), LetterState::Waiting);
    letters_.finish({{"p1", 1}}, LetterState::Accepted, "late, and true", 9);
    EXPECT_EQ(state("p1", 1), LetterState::Accepted);
}

TEST_P(LetterStoreTest, TellsWhichChannelsWereLeftWithLettersThatMayHaveBeenHandedOver) {
    divide("p1", {{1, "fax", true}, {2, "sms", true}, {3, "email", true}, {4, "postal", false}});
    std::unique_ptr<Database::Connection> const connection = open();
    VlServiced::JobStore jobs(*connection, {"other", 60});
    LetterStore const other(*connection, jobs);
    letters_.beginHandingOver({{"p1", 1}, {"p1", 4}}, 7);
    EXPECT_EQ(other.channelsLeft(),
              isPostgres() ? std::vector<std::string>{"fax"} : std::vector<std::string>())
        << "nobody has ever held it";
    for (char const* const channel : {"fax", "sms"})
        EXPECT_TRUE(letters_.holdChannel(channel, "ended", 7));
    EXPECT_EQ(state("p1", 1), isPostgres() ? LetterState::Uncertain : LetterState::HandedOver);
    letters_.beginHandingOver({{"p1", 2}}, 7);
    EXPECT_THAT(other.channelsLeft(), IsEmpty()) << "it is held";
    database_->run("UPDATE carriers SET held_until = 0");
    EXPECT_THAT(letters_.channelsLeft(), IsEmpty()) << "it is in its own hands";
    EXPECT_EQ(other.channelsLeft(),
              isPostgres() ? std::vector<std::string>{"sms"} : std::vector<std::string>());
}

TEST(LetterKeys, AreNoneOfAnotherLetterOrOfAMailing) {
    EXPECT_EQ((LetterId{"p1", 3}.key()), "p1-3");
    EXPECT_NE((LetterId{"p1-3", 1}.key()), (LetterId{"p1", 31}.key()));
}

TEST(LetterIds, AreFoundByTheirKeys) {
    using VlServiced::LetterId;
    EXPECT_EQ(LetterId::ofKey("7d3f-44-12"), (LetterId{"7d3f-44", 12}));
    EXPECT_EQ(LetterId::ofKey(LetterId{"p", 1}.key()), (LetterId{"p", 1}));
    EXPECT_EQ((LetterId{"p-n1", -3}.key()), "p-n1-n3");
    EXPECT_EQ(LetterId::ofKey("p-n1-n3"), (LetterId{"p-n1", -3}));
    for (char const* const none :
         {"", "p1", "p1-", "p1-x", "p1-0", "p1-1x", "p1-n", "p1-n0", "p1-n1x", "p1-99999999999999999999"})
        EXPECT_EQ(LetterId::ofKey(none), std::nullopt) << none;
}
VLSERVICE_ON_EACH_DATABASE(LetterStoreTest);
INSTANTIATE_TEST_SUITE_P(On, LetterStorePlans, testing::Values(Database::Backend::Sqlite),
                         VLServiceTest::OnEachDatabase::nameOf);

} // namespace
