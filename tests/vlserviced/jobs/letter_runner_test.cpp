#include "programs/vlserviced/jobs/letter_runner.h"

#include "programs/vlserviced/jobs/job_list.h"
#include "programs/vlserviced/jobs/job_runner.h"
#include "programs/vlserviced/store/schema.h"
#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/letter_help.h"
#include "vlservice/platform/log.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <deque>
#include <optional>

namespace {

namespace fs = std::filesystem;

using Carriers::Outcome;
using Carriers::Parcel;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::UnorderedElementsAre;
using VlServiced::JobRunner;
using VlServiced::LetterRunner;
using VlServiced::LetterState;

/// What the other side does, by the key that it is given something under.
struct OtherSide {
    std::vector<std::string> taken;
    std::vector<Carriers::Notice> notices;
    bool isRepeatable = true;
    /// The key under which something is on its way when the process ends.
    std::string last;
    std::map<std::string, Outcome> answers;
    std::map<std::string, Carriers::Progress> progress;
    /// What all are told that have no answer of their own.
    std::optional<Outcome> answer;
};

struct EndOfProcess {};

class FakeCarrier : public Carriers::Carrier {
public:
    explicit FakeCarrier(OtherSide& other) : other_(other) {}

    Outcome handOver(Parcel const& parcel, Carriers::PutOnRecord const& mayHaveIt) override {
        return take(parcel.key, mayHaveIt);
    }
    Outcome send(Carriers::Notice const& notice, Carriers::PutOnRecord const& mayHaveIt) override {
        Outcome const outcome = take(notice.key, mayHaveIt);
        other_.notices.push_back(notice);
        return outcome;
    }
    std::map<std::string, Carriers::Progress> ask(std::set<std::string> const& keys) override {
        std::map<std::string, Carriers::Progress> told;
        for (auto const& [key, progress] : other_.progress)
            if (keys.contains(key))
                told[key] = progress;
        return told;
    }
    std::string test() override { return "a fake"; }

private:
    Outcome take(std::string const& key, Carriers::PutOnRecord const& mayHaveIt) {
        if (!other_.isRepeatable)
            mayHaveIt();
        if (key == other_.last)
            throw EndOfProcess();
        other_.taken.push_back(key);
        if (auto const own = other_.answers.find(key); own != other_.answers.end())
            return own->second;
        return other_.answer.value_or(Outcome{Outcome::Kind::Accepted, "thanks"});
    }

    OtherSide& other_;
};

/// Work of carriers is done when the test says so. Whatever was not done by then is lost when a new process
/// takes over.
class LetterRunnerTest : public testing::Test {
protected:
    LetterRunnerTest() {
        fs::create_directory(outbox_);
        fs::create_directory(upload_);
        formerSink_ = Log::setSink([this](int, std::string const& line) { log_.push_back(line); });
        setCarriers(R"("postal": {"type": "folder", "folder": "/shop"})");
        start();
    }
    ~LetterRunnerTest() override { Log::setSink(formerSink_); }

    void setCarriers(std::string const& carriers) {
        settings_ = parse(R"({"upload_folder":")" + upload_.string() + R"(","carriers":{)" + carriers + "}}");
    }
    void start() {
        using Work = VlServiced::LetterSurroundings::Work;
        work_.clear();
        VlServiced::LetterSurroundings around{
            [this](std::string const& channel, std::size_t, Work work) {
                work_.emplace_back(channel, std::move(work));
            },
            [](Work const& work) { work(); },
            [](Work const& work) { work(); },
            [this] { return now_; },
            [this] { return VlServiced::ServiceSettings(settings_); },
            outbox_,
            [](long long) { return 0LL; },
            [this](Protocol::CarrierSettings const&) { return std::make_unique<FakeCarrier>(other_); },
            [this](std::string const& packId) { runner_->onLettersTaken(packId); },
        };
        around.took = [this](VlServiced::Step step, std::chrono::duration<double>) {
            steps_.emplace_back(VlServiced::stepName(step));
        };
        around.became = [this](std::string const& channel, LetterState state, std::size_t letters) {
            became_.push_back(channel + ' ' + Protocol::letterStateName(state) + ' ' +
                              std::to_string(letters));
        };
        around.stop = stop_;
        letterRunner_.emplace(letters_, jobs_, around);
        VlServiced::JobSurroundings surroundings{
            [](VlServiced::JobSurroundings::Work const& work) { work(); },
            [](VlServiced::JobSurroundings::Work const& work) { work(); },
            [](VlServiced::JobSurroundings::Work const& work) { work(); },
            [this] { return now_; },
            [this] { return VlServiced::ServiceSettings(settings_); },
            outbox_};
        surroundings.letters = &*letterRunner_;
        runner_.emplace(jobs_, std::move(surroundings));
    }
    void restart() {
        start();
        runner_->resume();
        letterRunner_->resume();
    }

    /// Has a mailing accepted that is handed over at once.
    void send(std::string const& id, std::vector<std::string> const& channels,
              std::string const& preset = "\"process_mode\": 2, ") {
        send(lettersOf(id, channels, preset));
    }
    void send(Mailing::Metadata const& mailing) {
        storeMailing(folder_ / "packs.db", mailing);
        runner_->accept(
            {folder_.path().string(), "packs.db", mailing.id}, [](std::string const&) {},
            [](std::string const& failure) { EXPECT_EQ(failure, ""); });
    }
    /// The next piece of work that carriers have been given.
    void doOne() {
        auto const [channel, work] = work_.front();
        work_.pop_front();
        work();
    }
    void doWork() {
        while (!work_.empty())
            doOne();
    }
    std::string state(std::string const& id, long long number) {
        auto const letter = letters_.find({id, number});
        return letter ? Protocol::letterStateName(letter->state) +
                            (letter->says.empty() ? "" : ": " + letter->says)
                      : std::string("none");
    }
    Protocol::JobReport report(std::string const& id) {
        Protocol::JobsQuery query;
        query.ids = {id};
        query.letters = true;
        VlServiced::SettingsStore store(*database_);
        VlServiced::SettingsService const settings(store);
        return listJobs(query, jobs_, letters_, settings, outbox_, now_, Policy::Grant::ofService())
            .jobs.at(0);
    }
    /// The job's state and problem.
    std::string job(std::string const& id) {
        Protocol::JobReport const told = report(id);
        return Protocol::stateName(told.state) + (told.problem.empty() ? "" : ": " + told.problem);
    }
    std::string decision(Protocol::LetterAction action, std::string const& id, long long number) {
        return failureOf([&] { letterRunner_->decide({action, id, number}); });
    }

    TemporaryFolder folder_;
    fs::path outbox_ = folder_ / "outbox";
    fs::path upload_ = folder_ / "upload";
    std::vector<std::string> log_;
    Log::Sink formerSink_;
    std::unique_ptr<Database::Connection> database_ = VlServiced::openServiceDatabase(folder_ / "service.db");
    VlServiced::JobStore jobs_{*database_};
    VlServiced::LetterStore letters_{*database_, jobs_};
    json::Object settings_;
    long long now_ = 1000;
    std::vector<std::string> steps_;
    std::vector<std::string> became_;
    OtherSide other_;
    std::deque<std::pair<std::string, std::function<void()>>> work_;
    Carriers::StopSign stop_;
    std::optional<LetterRunner> letterRunner_;
    std::optional<JobRunner> runner_;
};

TEST_F(LetterRunnerTest, HandsEachLetterOverUnderItsKey) {
    send("p1", {"postal", "postal"});
    EXPECT_EQ(job("p1"), "delivering");
    doWork();
    EXPECT_THAT(other_.taken, ElementsAre("p1-1", "p1-2"));
    EXPECT_EQ(state("p1", 1), "accepted: thanks");
    EXPECT_EQ(job("p1"), "lodged");
    EXPECT_FALSE(fs::exists(outbox_ / "p1.mailing"));
}

TEST_F(LetterRunnerTest, LeavesChannelsWithoutACarrierToTheUploadFolder) {
    send("p1", {"postal", "email"});
    EXPECT_TRUE(fs::exists(upload_ / "p1.mailing"));
    EXPECT_EQ(job("p1"), "submitted");
    std::vector<Protocol::LetterReport> const letters = report("p1").letters;
    EXPECT_EQ(letters.at(0).state, LetterState::Waiting);
    EXPECT_EQ(letters.at(1).state, LetterState::HandedOver);
    EXPECT_EQ(letters.at(1).says, "in the mailing's container");
    EXPECT_TRUE(fs::exists(outbox_ / "p1.mailing"));
    doWork();
    EXPECT_THAT(other_.taken, ElementsAre("p1-1"));
    EXPECT_EQ(job("p1"), "submitted");
    EXPECT_FALSE(fs::exists(outbox_ / "p1.mailing"));
    EXPECT_FALSE(fs::exists(outbox_ / "rest" / "p1.mailing"));
    fs::remove(upload_ / "p1.mailing");
    runner_->updateStatus("", "");
    EXPECT_EQ(job("p1"), "lodged");
}

TEST_F(LetterRunnerTest, LeavesAMailingAsItIsThatNoCarrierTakesLettersOf) {
    send("p1", {"email", "fax"});
    EXPECT_EQ(job("p1"), "submitted");
    EXPECT_THAT(work_, IsEmpty());
    EXPECT_EQ(report("p1").letters.size(), 2U);
}

TEST_F(LetterRunnerTest, TellsOfBothWhatTheContainersStateAndTheCarriersHaveLeftToDo) {
    send("p1", {"postal", "email"});
    fs::remove(upload_ / "p1.mailing");
    runner_->updateStatus("", "");
    EXPECT_EQ(job("p1"), "delivering");
    other_.answer = Outcome{Outcome::Kind::Refused, "no"};
    doWork();
    EXPECT_EQ(job("p1"), "failed: 1 letter failed, letter 1: no");
}

TEST_F(LetterRunnerTest, TellsWhatBecameOfLettersAndHowLongTheyTook) {
    setCarriers(R"("postal": {"type": "folder", "folder": "/shop", "unit": "mailing"},
                   "fax": {"type": "folder", "folder": "/fax"})");
    send("p1", {"postal", "postal", "fax"});
    other_.answers["p1-3"] = Outcome{Outcome::Kind::Refused, "no"};
    EXPECT_EQ(letterRunner_->inHand(), 3U);
    doWork();
    EXPECT_EQ(letterRunner_->inHand(), 0U);
    EXPECT_THAT(became_, UnorderedElementsAre("postal accepted 2", "fax failed 1"));
    EXPECT_THAT(steps_, ElementsAre("handing over", "handing over"));
}

TEST_F(LetterRunnerTest, NeedsNoUploadFolderWhereThereAreCarriers) {
    settings_ = parse(R"({"carriers":{"postal": {"type": "folder", "folder": "/shop"}}})");
    send("p1", {"postal"}, "");
    EXPECT_EQ(failureOf([&] { runner_->upload("", ""); }), "nothing was thrown");
    doWork();
    EXPECT_EQ(job("p1"), "lodged");
}

TEST_F(LetterRunnerTest, TakesNoLetterBeforeItsMailingIsReleased) {
    send("p1", {"postal"}, "\"process_mode\": 8, ");
    letterRunner_->proceed();
    EXPECT_THAT(work_, IsEmpty());
    send("p2", {"postal"}, "\"process_mode\": 128, ");
    EXPECT_EQ(job("p2"), "tried");
    runner_->change(Protocol::JobAction::Release, "p1");
    runner_->upload("", "");
    doWork();
    EXPECT_THAT(other_.taken, ElementsAre("p1-1"));
}

TEST_F(LetterRunnerTest, CallsNothingBackThatIsGoingOut) {
    send("p1", {"postal"});
    EXPECT_EQ(failureOf([&] { runner_->change(Protocol::JobAction::Cancel, "p1"); }),
              "it is too late to cancel mailing p1: its letters are going out by carriers");
    settings_.set("upload_folder", (folder_ / "gone").string());
    send("p2", {"postal", "email"});
    EXPECT_EQ(failureOf([&] { runner_->change(Protocol::JobAction::Hold, "p2"); }),
              "it is too late to hold mailing p2: letters of it are going out by carriers");
    doWork();
    EXPECT_EQ(failureOf([&] { runner_->change(Protocol::JobAction::Cancel, "p1"); }),
              "it is too late to cancel mailing p1: the carriers have its letters");
}

TEST_F(LetterRunnerTest, GivesALetterUpThatIsRefusedAndGoesOnWithTheOthers) {
    other_.answers["p1-1"] = {Outcome::Kind::Refused, "no such street"};
    send("p1", {"postal", "postal"});
    doWork();
    EXPECT_EQ(state("p1", 1), "failed: no such street");
    EXPECT_EQ(state("p1", 2), "accepted: thanks");
    EXPECT_EQ(job("p1"), "failed: 1 letter failed, letter 1: no such street");
    EXPECT_TRUE(fs::exists(outbox_ / "p1.mailing"));
}

TEST_F(LetterRunnerTest, TriesALetterAgainBehindPausesThatDouble) {
    other_.answers["p1-1"] = {Outcome::Kind::Failed, "no connection"};
    send("p1", {"postal"});
    for (long long const pause : {30, 60, 120}) {
        doWork();
        EXPECT_EQ(state("p1", 1), "waiting: no connection");
        EXPECT_EQ(letterRunner_->nextTime(), now_ + pause);
        now_ += pause - 1;
        letterRunner_->proceed();
        EXPECT_THAT(work_, IsEmpty());
        ++now_;
        letterRunner_->proceed();
        EXPECT_EQ(work_.size(), 1U);
    }
    other_.answers.clear();
    doWork();
    EXPECT_EQ(state("p1", 1), "accepted: thanks");
}

TEST_F(LetterRunnerTest, GivesALetterUpInTime) {
    setCarriers(R"("postal": {"type": "folder", "folder": "/shop", "give_up_hours": 1})");
    other_.answer = Outcome{Outcome::Kind::Failed, "no connection"};
    send("p1", {"postal"});
    doWork();
    now_ += 3600;
    letterRunner_->proceed();
    doWork();
    EXPECT_EQ(state("p1", 1), "failed: given up after 1 hours: no connection");
    EXPECT_EQ(job("p1"), "failed: 1 letter failed, letter 1: given up after 1 hours: no connection");
}

TEST_F(LetterRunnerTest, TriesACarrierEveryQuarterOfAnHourThatFailsTenTimesInARow) {
    other_.answer = Outcome{Outcome::Kind::Failed, "no connection for ada@example.org"};
    send("p1", std::vector<std::string>(12, "postal"));
    doWork();
    EXPECT_EQ(other_.taken.size(), 10U);
    EXPECT_EQ(letterRunner_->list().carriers.at(0).state, "failing");
    EXPECT_EQ(letterRunner_->list().carriers.at(0).says, "no connection for ada@example.org");
    EXPECT_THAT(log_,
                ElementsAre("The carrier of postal fails and is tried every 15 minutes: \"vlmail carriers "
                            "list\" says why"));
    EXPECT_EQ(letterRunner_->nextTime(), now_ + 900);
    now_ += 900;
    letterRunner_->proceed();
    doWork();
    EXPECT_EQ(other_.taken.size(), 11U);
    restart();
    EXPECT_THAT(work_, IsEmpty());
    other_.answer.reset();
    now_ += 900;
    letterRunner_->proceed();
    EXPECT_EQ(work_.size(), 1U);
    doWork();
    EXPECT_EQ(job("p1"), "lodged");
    EXPECT_EQ(letterRunner_->list().carriers.at(0).state, "working");
}

TEST_F(LetterRunnerTest, CountsNoRefusalAsAFailureOfTheCarrier) {
    other_.answer = Outcome{Outcome::Kind::Refused, "no"};
    send("p1", std::vector<std::string>(20, "postal"));
    doWork();
    EXPECT_EQ(other_.taken.size(), 20U);
    EXPECT_EQ(letterRunner_->list().carriers.at(0).state, "working");
}

TEST_F(LetterRunnerTest, HandsOverSideBySideAsManyAsItMay) {
    setCarriers(R"("postal": {"type": "folder", "folder": "/shop", "at_once": 3})");
    send("p1", std::vector<std::string>(5, "postal"));
    EXPECT_EQ(work_.size(), 3U);
    doOne();
    EXPECT_EQ(work_.size(), 3U);
    doWork();
    EXPECT_THAT(other_.taken, UnorderedElementsAre("p1-1", "p1-2", "p1-3", "p1-4", "p1-5"));
}

TEST_F(LetterRunnerTest, HoldsUpNoOtherChannel) {
    setCarriers(
        R"("postal": {"type": "folder", "folder": "/shop"}, "fax": {"type": "folder", "folder": "/fax"})");
    send("p1", {"postal", "postal", "fax"});
    std::vector<std::string> channels;
    for (auto const& [channel, work] : work_)
        channels.push_back(channel);
    EXPECT_THAT(channels, UnorderedElementsAre("postal", "fax"));
}

TEST_F(LetterRunnerTest, KeepsToTheHoursOfACarrier) {
    setCarriers(R"("postal": {"type": "folder", "folder": "/shop", "hours": "08:00-18:00"})");
    now_ = 7 * 3600;
    send("p1", {"postal"});
    EXPECT_THAT(work_, IsEmpty());
    EXPECT_EQ(letterRunner_->nextTime(), 8 * 3600);
    now_ = 8 * 3600;
    letterRunner_->proceed();
    EXPECT_EQ(work_.size(), 1U);
}

TEST_F(LetterRunnerTest, KeepsToTheRateOfACarrier) {
    setCarriers(R"("postal": {"type": "folder", "folder": "/shop", "per_minute": 2})");
    send("p1", {"postal", "postal", "postal"});
    doWork();
    EXPECT_EQ(other_.taken.size(), 2U);
    EXPECT_EQ(letterRunner_->nextTime(), now_ + 60);
    now_ += 60;
    letterRunner_->proceed();
    doWork();
    EXPECT_EQ(other_.taken.size(), 3U);
}

TEST_F(LetterRunnerTest, HandsNothingOverToACarrierThatIsPaused) {
    send("p1", {"postal", "postal"});
    letterRunner_->pause("postal");
    doWork();
    EXPECT_EQ(other_.taken.size(), 1U);
    EXPECT_EQ(letterRunner_->nextTime(), std::nullopt);
    restart();
    EXPECT_THAT(work_, IsEmpty());
    EXPECT_EQ(letterRunner_->list().carriers.at(0).state, "paused");
    EXPECT_EQ(letterRunner_->list().carriers.at(0).waiting, 1);
    letterRunner_->resume("postal");
    doWork();
    EXPECT_EQ(other_.taken.size(), 2U);
    EXPECT_EQ(failureOf([&] { letterRunner_->pause("fax"); }),
              "there is no carrier of fax: \"vlmail carriers list\" shows those that there are");
}

TEST_F(LetterRunnerTest, HandsNothingOverWhileJobsAreHeldBack) {
    send("p1", {"postal", "postal"});
    settings_.set("suspended", 2);
    doWork();
    EXPECT_EQ(other_.taken.size(), 1U);
    EXPECT_EQ(letterRunner_->nextTime(), std::nullopt);
    settings_.set("suspended", 0);
    letterRunner_->proceed();
    doWork();
    EXPECT_EQ(other_.taken.size(), 2U);
}

TEST_F(LetterRunnerTest, HandsOverAMailingAsOneWhereTheCarrierWantsIt) {
    setCarriers(R"("postal": {"type": "folder", "folder": "/shop", "unit": "mailing"})");
    send("p1", {"postal", "postal", "email"});
    send("p2", {"postal"});
    doWork();
    EXPECT_THAT(other_.taken, ElementsAre("p1-postal", "p2-postal"));
    EXPECT_EQ(state("p1", 1), "accepted: thanks");
    EXPECT_EQ(state("p1", 2), "accepted: thanks");
}

TEST_F(LetterRunnerTest, GoesOnWhereAProcessWasEnded) {
    send("p1", {"postal", "postal"});
    doOne();
    restart();
    doWork();
    EXPECT_THAT(other_.taken, ElementsAre("p1-1", "p1-2"));
    EXPECT_EQ(job("p1"), "lodged");
}

TEST_F(LetterRunnerTest, BringsAJobUpToDateWhoseLastLetterAProcessHadJustRecorded) {
    send("p1", {"postal"});
    send("p2", {"postal", "email"});
    letters_.finish({{"p1", 1}, {"p2", 1}}, LetterState::Accepted, "thanks", now_);
    restart();
    EXPECT_EQ(job("p1"), "lodged");
    EXPECT_EQ(job("p2"), "submitted");
    EXPECT_FALSE(fs::exists(outbox_ / "p1.mailing"));
    EXPECT_FALSE(fs::exists(outbox_ / "p2.mailing"));
}

TEST_F(LetterRunnerTest, KeepsALetterInHandWhoseOutcomeCannotBeRecorded) {
    send("p1", {"postal"});
    database_->run(
        "CREATE TEMP TRIGGER full BEFORE UPDATE ON letters BEGIN SELECT raise(FAIL, 'disk full'); END");
    doWork();
    letterRunner_->proceed();
    EXPECT_THAT(work_, IsEmpty());
    EXPECT_THAT(log_, testing::Contains(HasSubstr("What became of p1-1 cannot be recorded. ")));
    database_->run("DROP TRIGGER full");
    letterRunner_->proceed();
    EXPECT_EQ(state("p1", 1), "accepted: thanks");
    EXPECT_THAT(other_.taken, ElementsAre("p1-1"));
}

TEST_F(LetterRunnerTest, TakesNoFaultOfAContainerForOneOfTheCarrier) {
    send("p1", {"postal"});
    fs::rename(outbox_ / "p1.mailing", outbox_ / "away");
    doWork();
    EXPECT_EQ(state("p1", 1),
              "waiting: the container " + (outbox_ / "p1.mailing").string() + " cannot be read");
    EXPECT_EQ(letters_.carrier("postal").failures, 0);
    fs::rename(outbox_ / "away", outbox_ / "p1.mailing");
    now_ += 30;
    letterRunner_->proceed();
    doWork();
    EXPECT_EQ(state("p1", 1), "accepted: thanks");
}

TEST_F(LetterRunnerTest, SendsALetterAgainWhenAPersonWantsIt) {
    other_.answers["p1-1"] = {Outcome::Kind::Refused, "no such street"};
    send("p1", {"postal", "postal"});
    doWork();
    other_.answers.clear();
    EXPECT_EQ(
        decision(Protocol::LetterAction::Resend, "p1", 2),
        "letter 2 of mailing p1 is accepted: only one that is uncertain, failed or returned is sent again");
    EXPECT_EQ(decision(Protocol::LetterAction::Resend, "p1", 1), "nothing was thrown");
    EXPECT_EQ(state("p1", 1), "waiting: a person has it sent again");
    EXPECT_EQ(job("p1"), "delivering");
    doWork();
    EXPECT_THAT(other_.taken, ElementsAre("p1-1", "p1-2", "p1-1"));
    EXPECT_EQ(job("p1"), "lodged");
}

TEST_F(LetterRunnerTest, SendsALetterAgainWithoutTheOthersOfItsMailingAndUnderItsOwnKey) {
    setCarriers(R"("postal": {"type": "folder", "folder": "/shop", "unit": "mailing"})");
    other_.answer = Outcome{Outcome::Kind::Refused, "no paper"};
    send("p1", {"postal", "postal", "postal"});
    doWork();
    EXPECT_THAT(other_.taken, ElementsAre("p1-postal"));
    other_.answer = {};
    EXPECT_EQ(decision(Protocol::LetterAction::Resend, "p1", 3), "nothing was thrown");
    doWork();
    EXPECT_EQ(decision(Protocol::LetterAction::Resend, "p1", 2), "nothing was thrown");
    restart();
    doWork();
    EXPECT_THAT(other_.taken, ElementsAre("p1-postal", "p1-3", "p1-2"));
    EXPECT_THAT(report("p1").letters.at(2).tried, ElementsAre("postal"));
    EXPECT_EQ(state("p1", 1), "failed: no paper");
    EXPECT_EQ(state("p1", 2), "accepted: thanks");
    EXPECT_EQ(state("p1", 3), "accepted: thanks");
}

TEST_F(LetterRunnerTest, NeverSendsALetterAgainByItselfThatTheOtherSideMayHave) {
    other_.isRepeatable = false;
    send("p1", {"postal", "postal", "postal"});
    other_.last = "p1-2";
    doOne();
    EXPECT_EQ(state("p1", 1), "accepted: thanks");
    EXPECT_EQ(state("p1", 2), "waiting");
    EXPECT_THROW(doOne(), EndOfProcess);
    EXPECT_EQ(state("p1", 2), "handed over");
    other_.last.clear();
    restart();
    EXPECT_EQ(state("p1", 2), "uncertain: the service was ended while it was handed over");
    doWork();
    EXPECT_THAT(other_.taken, ElementsAre("p1-1", "p1-3"));
    EXPECT_EQ(job("p1"),
              "delivering: 1 letter uncertain, letter 2: the service was ended while it was handed over");
    EXPECT_EQ(decision(Protocol::LetterAction::Resend, "p1", 2), "nothing was thrown");
    other_.answer = Outcome{Outcome::Kind::Uncertain, "cut"};
    doWork();
    EXPECT_EQ(state("p1", 2), "uncertain: cut");
    EXPECT_EQ(letterRunner_->nextTime(), std::nullopt);
    EXPECT_EQ(decision(Protocol::LetterAction::SettleDelivered, "p1", 2), "nothing was thrown");
    EXPECT_EQ(job("p1"), "lodged");
}

TEST_F(LetterRunnerTest, LetsALetterWaitAsItWasThatACarrierGaveUpSinceTheServiceEnds) {
    other_.isRepeatable = false;
    other_.answer = Outcome{Outcome::Kind::Failed, "the service was ended"};
    send("p1", {"postal", "postal"});
    stop_.raise();
    doOne();
    EXPECT_EQ(state("p1", 1), "waiting");
    EXPECT_EQ(letters_.find({"p1", 1})->attempts, 0);
    EXPECT_EQ(letters_.carrier("postal").failures, 0);
    other_.answer = Outcome{Outcome::Kind::Uncertain, "cut"};
    doOne();
    EXPECT_THAT(state("p1", 2) + state("p1", 1), HasSubstr("uncertain: cut"));
}

TEST_F(LetterRunnerTest, TriesALetterAgainThatNobodyHasAlthoughItWasOnRecordAsHandedOver) {
    other_.isRepeatable = false;
    other_.answer = Outcome{Outcome::Kind::Failed, "no connection"};
    send("p1", {"postal"});
    doWork();
    EXPECT_EQ(state("p1", 1), "waiting: no connection");
    restart();
    EXPECT_EQ(state("p1", 1), "waiting: no connection");
}

constexpr char const* PRINTER = R"("postal": {"type": "printer", "uri": "ipp://printer:631/ipp/print"})";

TEST_F(LetterRunnerTest, KeepsTheOrderOfAMailingForPrinters) {
    setCarriers(PRINTER);
    other_.answers["p1-2"] = {Outcome::Kind::Failed, "busy"};
    send("p1", {"postal", "postal", "postal"});
    doWork();
    EXPECT_THAT(other_.taken, ElementsAre("p1-1", "p1-2"));
    EXPECT_EQ(state("p1", 3), "waiting");
    now_ += 29;
    letterRunner_->proceed();
    doWork();
    EXPECT_THAT(other_.taken, ElementsAre("p1-1", "p1-2"));
    other_.answers.clear();
    now_ += 1;
    letterRunner_->proceed();
    doWork();
    EXPECT_THAT(other_.taken, ElementsAre("p1-1", "p1-2", "p1-2", "p1-3"));
}

TEST_F(LetterRunnerTest, AsksPrintersWhatBecameOfLetters) {
    using Kind = Carriers::Progress::Kind;
    setCarriers(PRINTER);
    other_.progress["p1-1"] = {Kind::Delivered, "printed"};
    other_.progress["p1-2"] = {Kind::UnderWay, "out of paper"};
    send("p1", {"postal", "postal", "postal"});
    doWork();
    now_ += 15;
    EXPECT_EQ(letterRunner_->nextTime(), now_);
    letterRunner_->proceed();
    doWork();
    EXPECT_EQ(state("p1", 1), "delivered: printed");
    EXPECT_EQ(state("p1", 2), "accepted: out of paper");
    EXPECT_EQ(state("p1", 3), "accepted: thanks") << "nothing is known of it";
    EXPECT_EQ(job("p1"), "lodged");
    restart();
    other_.progress["p1-2"] = {Kind::Delivered, "printed"};
    other_.progress["p1-3"] = {Kind::Failed, "aborted"};
    now_ += 15;
    letterRunner_->proceed();
    doWork();
    EXPECT_EQ(state("p1", 2), "delivered: printed");
    EXPECT_EQ(state("p1", 3), "failed: aborted");
    EXPECT_EQ(job("p1"), "failed: 1 letter failed, letter 3: aborted");
    EXPECT_EQ(letterRunner_->nextTime(), std::nullopt);
}

TEST_F(LetterRunnerTest, LeavesALetterUncertainThatAPrinterHasBegunAndSendsOneAgainThatItHasNot) {
    using Kind = Carriers::Progress::Kind;
    setCarriers(PRINTER);
    other_.answer = Outcome{Outcome::Kind::Uncertain, "cut"};
    other_.progress["p1-1"] = {Kind::Delivered, "job 1 is printed"};
    other_.progress["p1-2"] = {Kind::Lost, "job 2 was aborted"};
    send("p1", {"postal", "postal"});
    doWork();
    now_ += 15;
    letterRunner_->proceed();
    doWork();
    EXPECT_EQ(state("p1", 1), "uncertain: it may not have arrived whole: job 1 is printed");
    EXPECT_EQ(state("p1", 2), "waiting: job 2 was aborted") << "nobody has it";
    EXPECT_THAT(other_.taken, ElementsAre("p1-1", "p1-2"));
    other_.answer.reset();
    other_.progress.clear();
    now_ += 30;
    letterRunner_->proceed();
    doWork();
    EXPECT_THAT(other_.taken, ElementsAre("p1-1", "p1-2", "p1-2"));
    EXPECT_EQ(state("p1", 2), "accepted: thanks");
    EXPECT_EQ(decision(Protocol::LetterAction::SettleDelivered, "p1", 1), "nothing was thrown");
}

TEST_F(LetterRunnerTest, LetsAPersonSettleALetterThatIsUncertain) {
    send("p1", {"postal", "email"});
    doWork();
    letters_.finish({{"p1", 1}}, LetterState::Uncertain, "cut", now_);
    EXPECT_EQ(decision(Protocol::LetterAction::SettleDelivered, "p1", 1), "nothing was thrown");
    EXPECT_EQ(state("p1", 1), "delivered: a person says so");
    EXPECT_EQ(decision(Protocol::LetterAction::SettleFailed, "p1", 1),
              "letter 1 of mailing p1 is delivered: only one that is uncertain can be settled");
    EXPECT_EQ(decision(Protocol::LetterAction::SettleFailed, "p1", 2),
              "letter 2 of mailing p1 goes in the mailing's container");
    EXPECT_EQ(decision(Protocol::LetterAction::Resend, "p1", 9), "there is no letter 9 of mailing p1");
}

TEST_F(LetterRunnerTest, NotesWhatServersReportOfLettersThatWentByEMail) {
    using Kind = Carriers::MailReport::Kind;
    setCarriers(
        R"("email": {"type": "smtp", "url": "smtp://mail.example", "from": "a@b.example", "subject": ""},
                   "postal": {"type": "folder", "folder": "/shop"})");
    other_.isRepeatable = false;
    other_.answers["p1-2"] = Outcome{Outcome::Kind::Uncertain, "cut"};
    other_.answers["p1-3"] = Outcome{Outcome::Kind::Refused, "no"};
    send("p1", {"email", "email", "email", "postal"});
    doWork();
    EXPECT_EQ(letterRunner_->note({"p1", 1}, Kind::UnderWay, "delayed").says, "delayed");
    EXPECT_EQ(state("p1", 1), "accepted: delayed");
    letterRunner_->note({"p1", 1}, Kind::Delivered, "");
    EXPECT_EQ(state("p1", 1), "delivered");
    letterRunner_->note({"p1", 1}, Kind::Returned, "550 \x1B no");
    EXPECT_EQ(state("p1", 1), "returned: 550 \\u001b no");
    EXPECT_EQ(letterRunner_->note({"p1", 2}, Kind::Delivered, "").state, LetterState::Delivered);
    EXPECT_EQ(job("p1"),
              "failed: 1 letter failed, letter 3: no; 1 letter returned, letter 1: 550 \\u001b no");
    auto const refused = [&](long long number) {
        return failureOf([&] { letterRunner_->note({"p1", number}, Kind::Delivered, ""); });
    };
    EXPECT_EQ(refused(1), "letter 1 of mailing p1 is returned, which the report does not go with");
    EXPECT_EQ(refused(3), "letter 3 of mailing p1 is failed, which the report does not go with");
    EXPECT_EQ(refused(4), "letter 4 of mailing p1 does not go by e-mail");
    EXPECT_EQ(refused(5), "there is no letter 5 of mailing p1");
}

TEST_F(LetterRunnerTest, TellsOfLettersWhoseCarrierIsGone) {
    send("p1", {"postal", "postal"});
    setCarriers("");
    doOne();
    EXPECT_THAT(work_, IsEmpty());
    Protocol::CarrierReport const report = letterRunner_->list().carriers.at(0);
    EXPECT_EQ(report.state, "missing");
    EXPECT_EQ(report.waiting, 1);
}

TEST_F(LetterRunnerTest, TestsACarrierWithoutSendingAnything) {
    std::string told;
    letterRunner_->test(
        "postal", [&](std::string const& says, std::string const& failure) { told = says + '|' + failure; });
    EXPECT_EQ(told, "a fake|");
    EXPECT_THAT(other_.taken, IsEmpty());
}

TEST_F(LetterRunnerTest, LeavesAnOlderMailingAsItIsWhosePagesAreNotThoseThatArePrinted) {
    storePack(folder_ / "packs.db", "p1", "a=acme", "\"process_mode\": 2, ");
    runner_->accept(
        {folder_.path().string(), "packs.db", "p1"}, [](std::string const&) {}, [](std::string const&) {});
    EXPECT_EQ(job("p1"), "submitted");
    EXPECT_THAT(report("p1").letters, IsEmpty());
}

TEST_F(LetterRunnerTest, LetsAMailingWaitWhoseContainerIsDamaged) {
    send("p1", {"postal"}, "");
    fs::resize_file(outbox_ / "p1.mailing", 40);
    runner_->upload("", "");
    EXPECT_EQ(job("p1"), "queued: the container " + (outbox_ / "p1.mailing").string() + " cannot be read");
}

constexpr char const* CONFIRMED =
    "\"process_mode\": 2, \"confirmation_email\": true, \"customer_email\": \"office@acme.example\", ";

/// With a carrier of e-mail, which sends notices.
class Notices : public LetterRunnerTest {
protected:
    Notices() { setCarriers(std::string(MAIL) + R"(, "postal": {"type": "folder", "folder": "/shop"})"); }

    /// Letters of which the first two have somebody to be notified, the second two of them.
    static Mailing::Metadata notifying(std::vector<std::string> const& channels) {
        Mailing::Metadata mailing =
            lettersOf("p1", channels, R"("process_mode": 2, "customer_email": "office@acme.example", )");
        addField(mailing.letters.at(0), "reference", "R-17", 0);
        addField(mailing.letters.at(0), "notify", "ada@example.org", -1);
        addField(mailing.letters.at(1), "notify",
                 parse(R"({"all":["ben@example.org","eve@example.org","ben@example.org",7]})").get("all"),
                 -2);
        return mailing;
    }
    std::vector<std::string> notices(std::string const& id) {
        std::vector<std::string> told;
        for (Protocol::NoticeReport const& notice : report(id).notices)
            told.push_back(notice.key + " of " + std::to_string(notice.letter) + ' ' +
                           Protocol::letterStateName(notice.state) +
                           (notice.says.empty() ? "" : ": " + notice.says));
        return told;
    }
    std::string noticeDecision(Protocol::LetterAction action, long long number) {
        return failureOf([&] { letterRunner_->decide({action, "p1", 0, number}); });
    }

    static constexpr char const* MAIL =
        R"("email": {"type": "smtp", "url": "smtp://mail.example", "from": "a@b.example", "subject": ""})";
};

TEST_F(Notices, TellTheSenderOnceAllLettersAreHandedOver) {
    other_.answers["p1-2"] = {Outcome::Kind::Refused, "no such street"};
    send("p1", {"postal", "postal", "email", "postal"}, CONFIRMED);
    doOne();
    doOne();
    EXPECT_THAT(notices("p1"), ElementsAre("p1-n1 of 0 held"));
    doWork();
    EXPECT_THAT(notices("p1"), ElementsAre("p1-n1 of 0 accepted: thanks"));
    ASSERT_EQ(other_.notices.size(), 1U);
    Carriers::Notice const& notice = other_.notices.front();
    EXPECT_EQ(notice.key, "p1-n1");
    EXPECT_EQ(notice.to, "office@acme.example");
    EXPECT_EQ(notice.subject, "Handed over: \"Title of p1\" (p1)");
    EXPECT_EQ(notice.text, "The mailing \"Title of p1\" (p1) was handed over.\n\n"
                           "email: 1 letter accepted\n"
                           "postal: 2 letters accepted\n"
                           "postal: 1 letter failed\n\n"
                           "\"vlmail status p1\" tells of each letter.\n");
    letterRunner_->proceed();
    restart();
    EXPECT_THAT(work_, IsEmpty()) << "it is told once";
}

TEST_F(Notices, WaitForTheContainerOfTheOtherLetters) {
    fs::remove(upload_);
    send("p1", {"postal", "fax"}, CONFIRMED);
    doWork();
    EXPECT_THAT(notices("p1"), ElementsAre("p1-n1 of 0 held"));
    fs::create_directory(upload_);
    runner_->resume();
    doWork();
    EXPECT_EQ(job("p1"), "submitted");
    ASSERT_EQ(other_.notices.size(), 1U);
    EXPECT_THAT(other_.notices.front().text,
                HasSubstr("fax: 1 letter handed on in the mailing's container\npostal: 1 letter accepted\n"));
}

TEST_F(Notices, TellOfAMailingThatGoesInAContainerAlone) {
    send("p1", {"fax", "fax"}, CONFIRMED);
    doWork();
    EXPECT_THAT(other_.taken, ElementsAre("p1-n1"));
    EXPECT_THAT(notices("p1"), ElementsAre("p1-n1 of 0 accepted: thanks"));
    EXPECT_EQ(job("p1"), "submitted");
}

TEST_F(Notices, TellOfAnOlderMailingByItsPages) {
    storePack(folder_ / "packs.db", "p1", "a=acme", CONFIRMED);
    runner_->accept(
        {folder_.path().string(), "packs.db", "p1"}, [](std::string const&) {}, [](std::string const&) {});
    doWork();
    ASSERT_EQ(other_.notices.size(), 1U);
    EXPECT_THAT(other_.notices.front().text, HasSubstr("3 pages handed on in the mailing's container\n"));
}

TEST_F(Notices, AreNoneWhereNobodySendsThemOrNobodyWantsThem) {
    send("p1", {"postal"}, "\"process_mode\": 2, \"confirmation_email\": true, ");
    send("p2", {"postal"}, "\"process_mode\": 2, \"customer_email\": \"office@acme.example\", ");
    setCarriers(R"("email": {"type": "folder", "folder": "/mails"})");
    send("p3", {"email"}, CONFIRMED);
    doWork();
    for (char const* const id : {"p1", "p2", "p3"})
        EXPECT_THAT(notices(id), IsEmpty()) << id;
}

TEST_F(Notices, TellWhomALetterNamesOnceItIsHandedOverAndNothingOutOfIt) {
    send(notifying({"postal", "fax", "postal"}));
    EXPECT_THAT(notices("p1"), ElementsAre("p1-n1 of 1 held", "p1-n2 of 2 waiting", "p1-n3 of 2 waiting"));
    doWork();
    EXPECT_THAT(notices("p1"), ElementsAre("p1-n1 of 1 accepted: thanks", "p1-n2 of 2 accepted: thanks",
                                           "p1-n3 of 2 accepted: thanks"));
    std::map<std::string, Carriers::Notice> told;
    for (Carriers::Notice const& notice : other_.notices)
        EXPECT_TRUE(told.emplace(notice.to, notice).second) << notice.to;
    EXPECT_EQ(told.at("ada@example.org").subject, "A letter was handed over: R-17");
    EXPECT_EQ(told.at("ada@example.org").text,
              "Letter 1 of the mailing p1 was handed over by postal.\n\nReference: R-17\n");
    EXPECT_EQ(told.at("ada@example.org").replyTo, "office@acme.example");
    EXPECT_EQ(told.at("ben@example.org").subject, "A letter was handed over");
    EXPECT_EQ(told.at("eve@example.org").text,
              "Letter 2 of the mailing p1 was handed over in a container.\n");
}

TEST_F(Notices, StayHeldOfALetterThatFailedUntilItGoesAfterAll) {
    other_.answers["p1-1"] = {Outcome::Kind::Refused, "no"};
    send(notifying({"postal", "postal"}));
    doWork();
    EXPECT_EQ(notices("p1").front(), "p1-n1 of 1 held");
    other_.answers.clear();
    EXPECT_EQ(decision(Protocol::LetterAction::Resend, "p1", 1), "nothing was thrown");
    doWork();
    EXPECT_EQ(notices("p1").front(), "p1-n1 of 1 accepted: thanks");
}

TEST_F(Notices, GoOnceAPersonSaysThatTheLetterHasArrived) {
    other_.answers["p1-1"] = {Outcome::Kind::Uncertain, "cut"};
    send(notifying({"postal", "postal"}));
    doWork();
    EXPECT_EQ(notices("p1").front(), "p1-n1 of 1 held");
    EXPECT_EQ(decision(Protocol::LetterAction::SettleDelivered, "p1", 1), "nothing was thrown");
    doWork();
    EXPECT_EQ(notices("p1").front(), "p1-n1 of 1 accepted: thanks");
}

TEST_F(Notices, FailNoMailing) {
    other_.answers["p1-n1"] = {Outcome::Kind::Refused, "550 nobody of that name"};
    send("p1", {"postal"}, CONFIRMED);
    doWork();
    EXPECT_THAT(notices("p1"), ElementsAre("p1-n1 of 0 failed: 550 nobody of that name"));
    EXPECT_EQ(job("p1"), "lodged");
    EXPECT_FALSE(fs::exists(outbox_ / "p1.mailing"));
}

TEST_F(Notices, AreTriedAgainByThePausesAndTheHoursOfTheirCarrier) {
    other_.answers["p1-n1"] = {Outcome::Kind::Failed, "451 busy"};
    send("p1", {"postal"}, CONFIRMED);
    doWork();
    EXPECT_THAT(notices("p1"), ElementsAre("p1-n1 of 0 waiting: 451 busy"));
    EXPECT_EQ(job("p1"), "lodged");
    EXPECT_EQ(letters_.carrier("email").failures, 1);
    EXPECT_EQ(letterRunner_->nextTime(), now_ + 30);
    EXPECT_EQ(letterRunner_->list().carriers.at(0).waiting, 1);
    other_.answers.clear();
    letterRunner_->pause("email");
    now_ += 30;
    letterRunner_->proceed();
    EXPECT_THAT(work_, IsEmpty());
    letterRunner_->resume("email");
    doWork();
    EXPECT_THAT(notices("p1"), ElementsAre("p1-n1 of 0 accepted: thanks"));
}

TEST_F(Notices, AreNeverSentAgainByThemselvesThatSomebodyMayHave) {
    other_.isRepeatable = false;
    send("p1", {"postal"}, CONFIRMED);
    other_.last = "p1-n1";
    EXPECT_THROW(doWork(), EndOfProcess);
    other_.last.clear();
    restart();
    EXPECT_THAT(work_, IsEmpty());
    EXPECT_THAT(notices("p1"),
                ElementsAre("p1-n1 of 0 uncertain: the service was ended while it was handed over"));
    EXPECT_EQ(job("p1"), "lodged");
    EXPECT_EQ(noticeDecision(Protocol::LetterAction::Resend, 2), "there is no notice 2 of mailing p1");
    EXPECT_EQ(noticeDecision(Protocol::LetterAction::Resend, 1), "nothing was thrown");
    doWork();
    EXPECT_THAT(notices("p1"), ElementsAre("p1-n1 of 0 accepted: thanks"));
    EXPECT_EQ(noticeDecision(Protocol::LetterAction::SettleFailed, 1),
              "notice 1 of mailing p1 is accepted: only one that is uncertain can be settled");
}

TEST_F(Notices, AreFoundByReportsOfServersToo) {
    send("p1", {"postal"}, CONFIRMED);
    doWork();
    letterRunner_->note({"p1", -1}, Carriers::MailReport::Kind::Returned, "550 mailbox is full");
    EXPECT_THAT(notices("p1"), ElementsAre("p1-n1 of 0 returned: 550 mailbox is full"));
    EXPECT_EQ(job("p1"), "lodged");
}

/// Letters by e-mail that may go by post, and by a channel that nobody has.
class LettersThatFallBack : public LetterRunnerTest {
protected:
    LettersThatFallBack() {
        setCarriers(
            R"("email": {"type": "smtp", "url": "smtp://mail.example", "from": "a@b.example", "subject": ""},
               "postal": {"type": "folder", "folder": "/shop", "unit": "mailing", "give_up_hours": 1})");
    }

    static Mailing::Metadata mailing(std::vector<std::string> const& channels) {
        Mailing::Metadata mailing = lettersOf(
            "p1", channels,
            R"("process_mode": 2, "production": {"fallback": ["email", "fax", "sms", "postal"]}, )");
        for (Mailing::MailedLetter& letter : mailing.letters)
            for (char const* const other : {"postal", "sms"})
                if (channelOf(letter) != other)
                    addField(letter, other, "the other way", 0 + (other[0] == 'p' ? 1 : 0));
        return mailing;
    }
    std::vector<std::string> tried(long long number) { return report("p1").letters.at(number - 1).tried; }
};

TEST_F(LettersThatFallBack, GoByTheNextChannelThatTheyHaveAnAddressOfAndACarrierIsOf) {
    other_.answers["p1-1"] = {Outcome::Kind::Refused, "550 no such user"};
    send(mailing({"email", "email"}));
    doOne();
    EXPECT_EQ(report("p1").letters.at(0).channel, "postal");
    EXPECT_EQ(
        state("p1", 1),
        "waiting: email: 550 no such user; the letter has no address fax; the letter has no address sms");
    EXPECT_THAT(tried(1), ElementsAre("email"));
    EXPECT_EQ(job("p1"), "delivering");
    other_.answers.clear();
    doWork();
    EXPECT_THAT(other_.taken, UnorderedElementsAre("p1-1", "p1-2", "p1-1"))
        << "under its own key, though the carrier takes mailings";
    EXPECT_EQ(state("p1", 1), "accepted: thanks");
    EXPECT_THAT(tried(1), ElementsAre("email"));
    EXPECT_THAT(tried(2), IsEmpty());
    EXPECT_EQ(job("p1"), "lodged");
}

TEST_F(LettersThatFallBack, HaveFailedWhenNoChannelIsLeft) {
    other_.answer = Outcome{Outcome::Kind::Refused, "no"};
    send(mailing({"email"}));
    doWork();
    EXPECT_THAT(other_.taken, ElementsAre("p1-1", "p1-1"));
    EXPECT_EQ(state("p1", 1), "failed: no");
    EXPECT_THAT(tried(1), ElementsAre("email"));
    EXPECT_EQ(job("p1"), "failed: 1 letter failed, letter 1: no");
}

TEST_F(LettersThatFallBack, GoOnWhenTheirCarrierGivesThemUpAndNotBefore) {
    other_.answer = Outcome{Outcome::Kind::Failed, "no connection"};
    send(mailing({"postal"}));
    doWork();
    EXPECT_EQ(report("p1").letters.at(0).channel, "postal");
    now_ += 3600;
    letterRunner_->proceed();
    doWork();
    EXPECT_EQ(state("p1", 1),
              "failed: given up after 1 hours: no connection; the letter has no address email; "
              "the letter has no address fax; the letter has no address sms");
    EXPECT_THAT(tried(1), IsEmpty());
}

TEST_F(LettersThatFallBack, StayWhereTheyAreWhileTheyAreUncertainOrCameBack) {
    other_.answers["p1-1"] = {Outcome::Kind::Uncertain, "cut"};
    send(mailing({"email", "email"}));
    doWork();
    EXPECT_EQ(state("p1", 1), "uncertain: cut");
    letterRunner_->note({"p1", 2}, Carriers::MailReport::Kind::Returned, "550 full");
    EXPECT_EQ(decision(Protocol::LetterAction::SettleFailed, "p1", 1), "nothing was thrown");
    doWork();
    EXPECT_EQ(state("p1", 1), "failed: a person says so");
    EXPECT_EQ(state("p1", 2), "returned: 550 full");
    EXPECT_THAT(other_.taken, ElementsAre("p1-1", "p1-2"));
}

TEST_F(LettersThatFallBack, PassAChannelOverWhoseCarrierIsGone) {
    other_.answer = Outcome{Outcome::Kind::Refused, "no"};
    send(mailing({"email"}));
    setCarriers(
        R"("email": {"type": "smtp", "url": "smtp://mail.example", "from": "a@b.example", "subject": ""})");
    doWork();
    EXPECT_THAT(state("p1", 1), testing::EndsWith("; there is no carrier of postal"));
    EXPECT_THAT(other_.taken, ElementsAre("p1-1"));
}

} // namespace
