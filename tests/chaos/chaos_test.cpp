// Services on one database while one thing goes wrong, and while many do. scripts/chaos goes on for longer.
#include "tests/chaos/round.h"
#include "tests/faults/fault.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <initializer_list>
#include <thread>

namespace {

using namespace Chaos;
using std::chrono::milliseconds;
using testing::IsEmpty;

constexpr milliseconds BEYOND_THE_LEASE{Installation::LEASE_SECONDS * 1250};

class ServicesInTrouble : public testing::Test {
protected:
    void SetUp() override {
        if (!installation_.whyNot().empty())
            GTEST_SKIP() << installation_.whyNot();
    }

    /// Each answered mailing is handed over once while that happens.
    void expectKept(std::vector<Step> const& steps) {
        constexpr int CLIENTS = 2;
        Round round(installation_, "m", 1);
        EXPECT_THAT(round.run(steps, CLIENTS), IsEmpty());
        EXPECT_GT(round.answered(), 0u);
    }
    /// At each service in turn, behind several numbers of pieces.
    static std::vector<Step> cutsOf(Kind kind) {
        std::vector<Step> steps;
        for (int const pieces : {0, 16})
            steps.push_back({{{kind, static_cast<std::size_t>(pieces) % Installation::SERVICES, pieces}},
                             milliseconds(300)});
        return steps;
    }

    Installation installation_;
};

TEST_F(ServicesInTrouble, HandEachMailingOverOnceWhenOneStandsStillForLongerThanItsLease) {
    expectKept(
        {{{{Kind::ServiceFreeze, 0}}, BEYOND_THE_LEASE}, {{{Kind::ServiceFreeze, 1}}, BEYOND_THE_LEASE}});
}

TEST_F(ServicesInTrouble, HandEachMailingOverOnceWhenTheDatabaseIsEndedAtOnce) {
    std::vector<Step> steps;
    for (int const time : {10, 300})
        steps.push_back({{{Kind::DatabaseCrash}}, milliseconds(time)});
    expectKept(steps);
}

TEST_F(ServicesInTrouble, HandEachMailingOverOnceWhenConnectionsToTheDatabaseAreCut) {
    expectKept(cutsOf(Kind::DatabaseCut));
}

TEST_F(ServicesInTrouble, HandEachMailingOverOnceWhenTheDatabaseDoesNotAnswerOneForLongerThanItsLease) {
    expectKept({{{{Kind::DatabaseStall, 0}}, BEYOND_THE_LEASE}});
}

TEST_F(ServicesInTrouble, HandEachMailingOverOnceWhenTheDiskOfTheDatabaseIsFullForAWhile) {
    if (!installation_.whyNoSmallDisk().empty())
        GTEST_SKIP() << "no right to mount a small disk: " << installation_.whyNoSmallDisk();
    expectKept({{{{Kind::FullDisk}}, milliseconds(1500)}});
}

TEST_F(ServicesInTrouble, HandEachMailingOverOnceWhenConnectionsOfClientsAreCut) {
    if (!installation_.whyNoRelay().empty())
        GTEST_SKIP() << "no right to make network namespaces: " << installation_.whyNoRelay();
    expectKept(cutsOf(Kind::ClientCut));
}

TEST_F(ServicesInTrouble, HandEachMailingOverOnceWhateverHappensAtRandom) {
    constexpr unsigned SEED = 11;
    expectKept(randomSteps(SEED, 5));
}

/// One that has a mailing to itself, and is killed at a call that makes something durable or visible.
class ServiceKilledInEachState : public ServicesInTrouble {
protected:
    /// Service 0, which stands still in front of the mailing's way to the database at the latest.
    void startKilledAt(long call) {
        installation_.freeze(1);
        installation_.kill(0);
        ASSERT_TRUE(installation_.start(0, Faults::environmentOf({"durable", 0, call}, counter_)));
    }
    void goOn() {
        installation_.thaw(1);
        if (!installation_.runs(0))
            installation_.kill(0);
        EXPECT_TRUE(installation_.start(0));
    }
    void send(SentMailing const& mailing) const {
        auto const file = installation_.folder() / (mailing.id() + ".mailing");
        constexpr int ATTEMPTS = 5;
        ClientRun run;
        // A client gives up at once that has never reached a service.
        for (int i = 0; i == 0 || (i < ATTEMPTS && run.status != 0); ++i)
            run = installation_.vlmail(0, {"send", file.string(), "--upload", "--node", "a=acme"});
        EXPECT_EQ(run.status, 0) << run.err;
    }
    /// Until it was handed over, or service 0 is gone.
    void awaitOutcome(SentMailing const& mailing) const {
        auto const database = installation_.database();
        while (
            installation_.runs(0) &&
            database->number("SELECT count(*) FROM jobs WHERE pack = $1 AND state IN ('submitted', 'lodged')",
                             mailing.id()) == 0)
            database->run("SELECT pg_sleep(0.02)");
    }
    /// How many such calls there were.
    long bring(SentMailing const& mailing, long killedAt) {
        mailing.write(installation_.folder() / (mailing.id() + ".mailing"));
        startKilledAt(killedAt);
        std::thread client([&] { send(mailing); });
        awaitOutcome(mailing);
        long const calls = Faults::callsIn(counter_);
        goOn();
        client.join();
        return calls;
    }

    /// A mailing for every so many calls. How many there were.
    std::size_t killAtEach(long step, SentMailing::Kind kind) {
        installation_.kill(2);
        startKilledAt(0);
        long const first = Faults::callsIn(counter_);
        std::map<std::string, SentMailing> answered;
        long calls = first + 1;
        for (long at = first; at <= calls; at += step) {
            SentMailing const mailing("k" + std::to_string(at), kind);
            // None at first, to see how many there are.
            long const made = bring(mailing, at == first ? 0 : at);
            calls = at == first ? made : calls;
            answered.emplace(mailing.id(), mailing);
        }
        EXPECT_TRUE(installation_.start(2));
        EXPECT_THAT(Round(installation_, "k", 1).check(answered), IsEmpty());
        return answered.size();
    }

    std::filesystem::path counter_ = installation_.folder() / "calls";
};

TEST_F(ServiceKilledInEachState, LeavesItsMailingToTheOthersWhoHandItOverOnce) {
    EXPECT_GT(killAtEach(1, SentMailing::Kind::InContainer), 6u);
}

/// Of those that are uncertain the print shop is asked.
TEST_F(ServiceKilledInEachState, LeavesItsLettersToTheOthersAndNoneIsHandedOverTwice) {
    EXPECT_GT(killAtEach(4, SentMailing::Kind::ByCarrier), 4u);
}

} // namespace
