#include "programs/vlserviced/jobs/job_runner.h"

#include "programs/vlserviced/jobs/hand_over.h"
#include "programs/vlserviced/store/schema.h"
#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/json_help.h"
#include "tests/vlserviced/pack_help.h"

#include <SQLiteCpp/Database.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <deque>
#include <fstream>
#include <optional>

namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;

using VlServiced::JobRunner;
using VlServiced::UploadFolder;

/// A runner whose worker does what it was given only when the test says so. Whatever was not done by then is
/// lost when a new runner takes over, as it is with a process.
class JobRunnerTest : public testing::Test {
protected:
    JobRunnerTest() {
        fs::create_directory(outbox_);
        fs::create_directory(upload_);
        settings_ = parse(R"({"upload_folder":")" + upload_.string() + "\"}");
        startRunner();
    }

    void startRunner() {
        work_.clear();
        VlServiced::JobSurroundings surroundings{
            [this](VlServiced::JobSurroundings::Work work) { work_.push_back(std::move(work)); },
            [this](VlServiced::JobSurroundings::Work const& work) {
                readersWork_ ? readersWork_->push_back(work) : work();
            },
            [](VlServiced::JobSurroundings::Work const& work) { work(); },
            [this] { return now_; },
            [this] {
                if (settingsFailIn_ > 0 && --settingsFailIn_ == 0)
                    throw Database::QueryError(Database::QueryError::Kind::Lost, "the database is gone");
                return VlServiced::ServiceSettings(settings_);
            },
            outbox_,
            [this](std::string const&) { return rules_; },
            [](std::string const& node, std::string const& packPreset) {
                return node + " for " + packPreset;
            },
            [](long long) { return 0LL; },
            [this](std::string const& node, std::string const& packPreset) {
                used_.push_back(node + ' ' + packPreset);
            },
        };
        surroundings.took = [this](VlServiced::Step step, std::chrono::duration<double>) {
            steps_.emplace_back(VlServiced::stepName(step));
        };
        runner_.emplace(jobs_, surroundings);
    }
    void doWork() {
        for (; !work_.empty(); work_.pop_front())
            work_.front()();
    }
    void accept(std::string const& packId) {
        EXPECT_EQ(acceptFailure(folder_.path().string(), "packs.db", packId), "nothing was thrown");
    }
    void acceptStored(std::string const& packId, std::string const& preset = "") {
        storePack(packs_, packId, "a=acme", preset);
        accept(packId);
    }
    /// What a change says.
    std::string change(Protocol::JobAction action, std::string const& packId = "p1") {
        return failureOf([&] { runner_->change(action, packId); });
    }
    /// As a process does that was started anew.
    void restart() {
        startRunner();
        runner_->resume();
        doWork();
    }
    long long fence() const { return jobs_.find("p1")->fence; }
    bool isStaged() const {
        return fs::exists(upload_ / (".p1.mailing." + std::to_string(fence()) + ".part"));
    }
    bool isInOutbox() const { return fs::exists(outbox_ / "p1.mailing"); }
    bool isHandedOver() const { return fs::exists(upload_ / "p1.mailing"); }
    std::string state(std::string const& packId) {
        std::optional<VlServiced::Job> const job = jobs_.find(packId);
        return !job ? "none" : stateName(job->state) + (job->problem.empty() ? "" : ": " + job->problem);
    }
    std::string acceptFailure(std::string const& folder, std::string const& database,
                              std::string const& packId) {
        std::string told = "never told";
        runner_->accept(
            {folder, database, packId}, [](std::string const&) {},
            [&](std::string const& failure) { told = failure.empty() ? "nothing was thrown" : failure; });
        return told;
    }
    void stageOnRecord() {
        UploadFolder const upload(upload_, {});
        VlServiced::stage(outbox_ / "p1.mailing", upload, fence());
        jobs_.beginSubmitting("p1", upload_.string(), upload.identity().text(), now_);
    }
    /// Less the folder's mark.
    std::ptrdiff_t filesInUpload() const { return std::distance(fs::directory_iterator(upload_), {}) - 1; }
    /// The mark that the line of another folder asks for.
    std::string anotherFolder(std::string const& mark) const {
        return "the upload folder " + upload_.string() +
               " is another one than before: mount the one whose file .vlserviced reads " + mark;
    }
    void run(char const* sql) { SQLite::Database(packs_, SQLite::OPEN_READWRITE).exec(sql); }
    void setSettings(std::string const& text) { settings_ = parse(text); }

    TemporaryFolder folder_;
    fs::path packs_ = folder_ / "packs.db";
    fs::path outbox_ = folder_ / "outbox";
    fs::path upload_ = folder_ / "upload";
    std::unique_ptr<Database::Connection> database_ = VlServiced::openServiceDatabase(folder_ / "service.db");
    VlServiced::JobStore jobs_{*database_};
    json::Object settings_;
    /// The question for them that is not answered, counted from 1.
    int settingsFailIn_ = 0;
    std::deque<VlServiced::JobSurroundings::Work> work_;
    /// When it is there, what the readers were given waits in it.
    std::optional<std::deque<VlServiced::JobSurroundings::Work>> readersWork_;
    long long now_ = 1000;
    Policy::Rules rules_;
    /// Nodes and pack presets of accepted mailings.
    std::vector<std::string> used_;
    std::vector<std::string> steps_;
    std::optional<JobRunner> runner_;
};

TEST_F(JobRunnerTest, PutsThePackOnRecordBeforeThePagesAreFetched) {
    acceptStored("p1");
    EXPECT_EQ(state("p1"), "accepted");
    VlServiced::Job const job = jobs_.find("p1").value();
    EXPECT_EQ(job.title, "Title of p1");
    EXPECT_EQ(job.cfgId, "a=acme");
    EXPECT_EQ(job.documents, 2);
    EXPECT_EQ(job.pages, 3);
    EXPECT_EQ(job.acceptedAt, 1000);
    now_ = 1005;
    doWork();
    EXPECT_EQ(state("p1"), "queued");
    EXPECT_EQ(jobs_.find("p1")->changedAt, 1005);
    EXPECT_EQ(contentOf(outbox_ / "p1.mailing"), contentOfPack("p1"));
}

TEST_F(JobRunnerTest, TellsHowLongEachStepTakesOnTheWay) {
    acceptStored("p1");
    EXPECT_THAT(steps_, ElementsAre("admission"));
    doWork();
    runner_->upload("", "");
    doWork();
    EXPECT_EQ(state("p1"), "submitted");
    EXPECT_THAT(steps_, ElementsAre("admission", "packing", "staging", "publishing"));
}

TEST_F(JobRunnerTest, TakesAPackOnceHoweverOftenItIsSent) {
    acceptStored("p1");
    accept("p1");
    EXPECT_EQ(work_.size(), 1u);
    doWork();
    accept("p1");
    doWork();
    EXPECT_EQ(state("p1"), "queued");
    runner_->upload("", "");
    doWork();
    accept("p1");
    doWork();
    EXPECT_EQ(state("p1"), "submitted");
    EXPECT_FALSE(fs::exists(outbox_ / "p1.mailing"));
    fs::remove(upload_ / "p1.mailing");
    runner_->updateStatus("", "");
    accept("p1");
    doWork();
    EXPECT_EQ(state("p1"), "lodged");
    EXPECT_FALSE(fs::exists(upload_ / "p1.mailing"));
}

TEST_F(JobRunnerTest, FindsTheSameFolderUnderAnySpelling) {
    acceptStored("p1");
    std::string const folder = folder_.path().string();
    EXPECT_EQ(acceptFailure(folder + "/", "packs.db", "p1"), "nothing was thrown");
    EXPECT_EQ(acceptFailure(folder + "/x/..", "packs.db", "p1"), "nothing was thrown");
    doWork();
    runner_->upload(folder + "//", "packs.db");
    doWork();
    EXPECT_EQ(state("p1"), "submitted");
}

TEST_F(JobRunnerTest, RefusesPacksThatItCannotTake) {
    storePack(packs_, "p1");
    storePack(packs_, "wrong node", "acme");
    storePack(packs_, "no pages");
    storePack(packs_, "bad title");
    storePack(packs_, "disabled", "u=eve/a=closed");
    run("DELETE FROM pages WHERE pack = 'no pages'; UPDATE packs SET title = char(10) WHERE id = 'bad "
        "title'");
    setSettings(R"({"disabled":["a=closed"]})");
    std::string const folder = folder_.path().string();
    struct {
        std::string folder;
        std::string database;
        std::string packId;
        std::string message;
    } const cases[] = {
        {"db.example:5432", "packs", "p1",
         "pages come over the connection or from a pack database below the folder of --local-packs: "
         "\"db_conn\" has to be the absolute path of a folder there, and \"db.example:5432\" is none "
         "[setting-invalid]"},
        {"", "packs.db", "p1",
         "pages come over the connection or from a pack database below the folder of --local-packs: "
         "\"db_conn\" has to be the absolute path of a folder there, and \"\" is none [setting-invalid]"},
        {folder, "../packs.db", "p1",
         "\"db_name\" has to be the name of a file, and \"../packs.db\" is none [setting-invalid]"},
        {folder, "", "p1", "\"db_name\" has to be the name of a file, and \"\" is none [setting-invalid]"},
        {folder, "packs.db", "../p1", "the pack id \"../p1\" cannot name a file [mailing-id-invalid]"},
        {folder, "packs.db", "", "the pack id \"\" cannot name a file [mailing-id-invalid]"},
        {folder, "other.db", "p1", "there is no pack database " + folder + "/other.db [database-missing]"},
        {folder, "service.db", "p1", folder + "/service.db is not a pack database [database-unusable]"},
        {folder, "packs.db", "p2",
         "the pack database " + folder + "/packs.db has no finished pack p2 [mailing-unknown]"},
        {folder, "packs.db", "wrong node",
         "node id \"acme\" is not valid: wanted is a path like u=NAME/ou=GROUP/a=ACCOUNT, or the same "
         "without its "
         "front [node-invalid]"},
        {folder, "packs.db", "no pages", "pack no pages has no pages [mailing-invalid]"},
        {folder, "packs.db", "bad title",
         "the title of pack bad title is not a line of text of at most 500 bytes [mailing-invalid]"},
        {folder, "packs.db", "disabled",
         "node u=eve/a=closed is disabled: pack disabled is not taken [node-disabled]"},
    };
    for (auto const& [db, name, packId, message] : cases) {
        EXPECT_EQ(acceptFailure(db, name, packId), message);
        EXPECT_EQ(state(packId), "none");
    }
}

TEST_F(JobRunnerTest, RefusesAnotherPackOfAnIdThatIsKnown) {
    acceptStored("p1");
    EXPECT_EQ(acceptFailure("/elsewhere", "packs.db", "p1"),
              "there is another pack p1, from " + packs_.string() + " [mailing-exists]");
}

TEST_F(JobRunnerTest, GivesUpAPackThatIsBad) {
    acceptStored("p1");
    run("UPDATE pages SET data = 'x' WHERE position = 0");
    doWork();
    EXPECT_EQ(state("p1"), "failed: page 1 of the pack is not a compressed page");
    EXPECT_EQ(acceptFailure(folder_.path().string(), "packs.db", "p1"),
              "pack p1 was given up: page 1 of the pack is not a compressed page [state-refused]");
    runner_->resume();
    EXPECT_TRUE(work_.empty());
}

TEST_F(JobRunnerTest, TriesAgainWhatMayPass) {
    acceptStored("p1");
    fs::remove(outbox_);
    doWork();
    EXPECT_EQ(state("p1"), "accepted: cannot write into " + outbox_.string() + ": No such file or directory");
    fs::create_directory(outbox_);
    runner_->updateStatus("/elsewhere", "");
    EXPECT_TRUE(work_.empty());
    runner_->updateStatus(folder_.path().string(), "packs.db");
    doWork();
    EXPECT_EQ(state("p1"), "queued");
}

TEST_F(JobRunnerTest, HandsOnWhatIsQueuedAndWhatWillBe) {
    acceptStored("p1");
    doWork();
    acceptStored("p2");
    storePack(folder_ / "other.db", "p3");
    EXPECT_EQ(acceptFailure(folder_.path().string(), "other.db", "p3"), "nothing was thrown");
    runner_->upload(folder_.path().string(), "packs.db");
    doWork();
    EXPECT_EQ(state("p1"), "submitted");
    EXPECT_EQ(state("p2"), "submitted");
    EXPECT_EQ(state("p3"), "queued");
    EXPECT_EQ(contentOf(upload_ / "p1.mailing"), contentOfPack("p1"));
    EXPECT_EQ(contentOf(upload_ / "p2.mailing"), contentOfPack("p2"));
    EXPECT_FALSE(fs::exists(outbox_ / "p1.mailing"));
    EXPECT_TRUE(fs::exists(outbox_ / "p3.mailing"));
}

TEST_F(JobRunnerTest, HandsNothingOnWithoutAFolder) {
    setSettings("{}");
    acceptStored("p1");
    EXPECT_EQ(
        failureOf([&] { runner_->upload("", ""); }),
        "the service has no upload folder: set one with \"vlmail settings service upload_folder=PATH\"");
}

TEST_F(JobRunnerTest, KeepsAContainerWhoseFolderIsGoneUntilItIsBack) {
    acceptStored("p1");
    doWork();
    fs::remove(upload_);
    runner_->upload("", "");
    doWork();
    EXPECT_EQ(state("p1"),
              "queued: there is no upload folder " + upload_.string() + ": No such file or directory");
    EXPECT_TRUE(fs::exists(outbox_ / "p1.mailing"));
    fs::create_directory(upload_);
    runner_->resume();
    doWork();
    EXPECT_EQ(state("p1"), "submitted");
}

TEST_F(JobRunnerTest, FollowsWhatTheCarrierDoes) {
    for (char const* id : {"waits", "taken", "done", "returned", "at once"})
        acceptStored(id);
    runner_->upload("", "");
    doWork();
    for (char const* id : {"taken", "done", "returned"})
        fs::remove(upload_ / (id + std::string(".mailing")));
    runner_->updateStatus("", "");
    for (char const* id : {"taken", "done", "returned"})
        EXPECT_EQ(state(id), "lodged");
    std::ofstream(upload_ / "done.mailing.status") << R"({"state":"delivered"})";
    std::ofstream(upload_ / "at once.mailing.status") << R"({"state":"delivered"})";
    std::ofstream(upload_ / "returned.mailing.status") << R"({"state":"failed","text":"no\nsuch street"})";
    runner_->updateStatus("", "");
    EXPECT_EQ(state("waits"), "submitted");
    EXPECT_EQ(state("taken"), "lodged");
    EXPECT_EQ(state("done"), "delivered");
    EXPECT_EQ(state("at once"), "delivered");
    EXPECT_EQ(state("returned"), "failed: the carrier: no such street");
}

TEST_F(JobRunnerTest, ConcludesNothingFromAFolderThatIsGone) {
    acceptStored("p1");
    runner_->upload("", "");
    doWork();
    fs::rename(upload_, folder_ / "unmounted");
    runner_->updateStatus("", "");
    EXPECT_EQ(state("p1"),
              "submitted: there is no upload folder " + upload_.string() + ": No such file or directory");
    fs::rename(folder_ / "unmounted", upload_);
    runner_->updateStatus("", "");
    EXPECT_EQ(state("p1"), "submitted");
}

TEST_F(JobRunnerTest, HoldsJobsBackWhileItIsSuspended) {
    settings_.set("suspended", 2);
    acceptStored("p1");
    EXPECT_TRUE(work_.empty());
    EXPECT_EQ(state("p1"), "accepted");
    settings_.set("suspended", 1);
    runner_->resume();
    doWork();
    EXPECT_EQ(state("p1"), "queued");
}

// What a process that was killed leaves behind, step by step along the way of a job.

TEST_F(JobRunnerTest, GoesOnBehindTheAcceptance) {
    acceptStored("p1");
    startRunner();
    EXPECT_EQ(state("p1"), "accepted");
    runner_->resume();
    doWork();
    EXPECT_EQ(contentOf(outbox_ / "p1.mailing"), contentOfPack("p1"));
}

TEST_F(JobRunnerTest, GoesOnBehindAContainerThatIsNotOnRecord) {
    acceptStored("p1");
    doWork();
    database_->run("UPDATE jobs SET state = 'accepted'");
    startRunner();
    runner_->resume();
    doWork();
    EXPECT_EQ(state("p1"), "queued");
    EXPECT_EQ(contentOf(outbox_ / "p1.mailing"), contentOfPack("p1"));
}

TEST_F(JobRunnerTest, GoesOnBehindAnUploadThatWasOnlyWanted) {
    acceptStored("p1");
    doWork();
    runner_->upload("", "");
    startRunner();
    runner_->resume();
    doWork();
    EXPECT_EQ(state("p1"), "submitted");
    EXPECT_EQ(contentOf(upload_ / "p1.mailing"), contentOfPack("p1"));
}

TEST_F(JobRunnerTest, GoesOnBehindAStagedContainer) {
    acceptStored("p1");
    doWork();
    stageOnRecord();
    startRunner();
    runner_->resume();
    EXPECT_EQ(state("p1"), "submitted");
    EXPECT_EQ(contentOf(upload_ / "p1.mailing"), contentOfPack("p1"));
    EXPECT_FALSE(fs::exists(outbox_ / "p1.mailing"));
}

TEST_F(JobRunnerTest, SweepsFromTheUploadFolderWhatNobodyPublishesAnyMore) {
    acceptStored("p1");
    doWork();
    stageOnRecord();
    UploadFolder const upload(upload_, {});
    database_->run("UPDATE jobs SET fence = fence + 5, submit_fence = submit_fence + 5");
    VlServiced::stage(outbox_ / "p1.mailing", upload, fence());
    VlServiced::stage(outbox_ / "p1.mailing", upload, fence() - 1);
    VlServiced::stage(outbox_ / "p1.mailing", upload, fence() + 1);
    runner_->sweep();
    EXPECT_TRUE(isStaged()) << "it is on record";
    EXPECT_FALSE(fs::exists(upload_ / (".p1.mailing." + std::to_string(fence() - 1) + ".part")));
    EXPECT_TRUE(fs::exists(upload_ / (".p1.mailing." + std::to_string(fence() + 1) + ".part")))
        << "somebody is about to put it on record";
}

TEST_F(JobRunnerTest, DoesNotSubmitAgainWhatWasPublishedAndTakenAlready) {
    acceptStored("p1");
    doWork();
    stageOnRecord();
    VlServiced::publish("p1.mailing", UploadFolder(upload_, {}), fence());
    fs::remove(upload_ / "p1.mailing");
    startRunner();
    runner_->resume();
    doWork();
    EXPECT_EQ(state("p1"), "submitted");
    EXPECT_EQ(filesInUpload(), 0);
    runner_->updateStatus("", "");
    EXPECT_EQ(state("p1"), "lodged");
}

TEST_F(JobRunnerTest, SubmitsIntoTheFolderThatItWasStagedIn) {
    acceptStored("p1");
    doWork();
    stageOnRecord();
    setSettings(R"({"upload_folder":"/elsewhere"})");
    startRunner();
    runner_->resume();
    EXPECT_EQ(state("p1"), "submitted");
    EXPECT_TRUE(fs::exists(upload_ / "p1.mailing"));
}

TEST_F(JobRunnerTest, WaitsForTheFolderThatItWasStagedIn) {
    acceptStored("p1");
    doWork();
    stageOnRecord();
    std::string const mark = UploadFolder(upload_, {}).identity().mark;
    fs::rename(upload_, folder_ / "unmounted");
    fs::create_directory(upload_);
    startRunner();
    runner_->resume();
    EXPECT_EQ(state("p1"), "submitting: " + anotherFolder(mark));
    EXPECT_TRUE(fs::exists(outbox_ / "p1.mailing")) << "the container is lost";
    fs::remove(upload_);
    fs::rename(folder_ / "unmounted", upload_);
    runner_->resume();
    EXPECT_EQ(state("p1"), "submitted");
    EXPECT_EQ(contentOf(upload_ / "p1.mailing"), contentOfPack("p1"));
}

TEST_F(JobRunnerTest, TakesNothingForLodgedThatIsMissingInAnotherFolder) {
    acceptStored("p1");
    runner_->upload("", "");
    doWork();
    std::string const mark = UploadFolder(upload_, {}).identity().mark;
    fs::rename(upload_, folder_ / "unmounted");
    fs::create_directory(upload_);
    runner_->updateStatus("", "");
    EXPECT_EQ(state("p1"), "submitted: " + anotherFolder(mark));
    fs::remove(upload_);
    fs::rename(folder_ / "unmounted", upload_);
    runner_->updateStatus("", "");
    EXPECT_EQ(state("p1"), "submitted");
}

TEST_F(JobRunnerTest, StagesNothingIntoAnotherFolderThanTheOneThatWasSet) {
    UploadFolder const set(upload_, {});
    settings_.set("upload_folder_identity", set.identity().text());
    fs::rename(upload_, folder_ / "unmounted");
    fs::create_directory(upload_);
    acceptStored("p1");
    runner_->upload("", "");
    doWork();
    EXPECT_EQ(state("p1"), "queued: " + anotherFolder(set.identity().mark));
    EXPECT_TRUE(fs::is_empty(upload_));
}

TEST_F(JobRunnerTest, ChangesNothingOfAJobThatAnotherServiceHasTakenHoldOf) {
    // Whichever question fails while its container is made and about to be staged.
    for (int question = 1; question <= 8; ++question) {
        std::string const id = "p" + std::to_string(question);
        acceptStored(id, R"("process_mode": 2, )");
        settingsFailIn_ = question;
        work_.front()();
        work_.pop_front();
        settingsFailIn_ = 0;
        std::string const before = state(id);
        database_->run("UPDATE jobs SET holder = 'another', fence = fence + 1, try_at = clock_ms() + 60000");
        doWork();
        EXPECT_EQ(state(id), before) << question;
        EXPECT_FALSE(fs::exists(upload_ / (id + ".mailing"))) << question;
        startRunner();
    }
}

TEST_F(JobRunnerTest, RemovesLaterWhatStayedInTheOutbox) {
    acceptStored("p1");
    doWork();
    // A folder that is not empty stands where the container is, and cannot be removed.
    fs::path const container = outbox_ / "p1.mailing";
    stageOnRecord();
    fs::remove(container);
    fs::create_directories(container / "below");
    runner_->resume();
    EXPECT_EQ(state("p1"), "submitted");
    EXPECT_TRUE(fs::exists(container));
    fs::remove(container / "below");
    runner_->resume();
    EXPECT_FALSE(fs::exists(container));
}

TEST_F(JobRunnerTest, RemovesWhatAnEarlierProcessLeftInTheOutbox) {
    acceptStored("p1");
    acceptStored("p2");
    doWork();
    database_->run("UPDATE jobs SET state = 'lodged' WHERE pack = 'p1'");
    std::ofstream(outbox_ / "stranger.mailing") << "x";
    startRunner();
    runner_->resume();
    EXPECT_FALSE(fs::exists(outbox_ / "p1.mailing"));
    EXPECT_TRUE(fs::exists(outbox_ / "p2.mailing"));
    EXPECT_TRUE(fs::exists(outbox_ / "stranger.mailing"));
}

TEST_F(JobRunnerTest, NeverReadsAPackDatabaseOnItsOwnThread) {
    storePack(packs_, "p1");
    readersWork_.emplace();
    EXPECT_EQ(acceptFailure(folder_.path().string(), "packs.db", "p1"), "never told");
    EXPECT_EQ(acceptFailure("/dev", "null", "p2"), "never told");
    EXPECT_EQ(state("p1"), "none");
    EXPECT_EQ(readersWork_->size(), 2u);
}

TEST_F(JobRunnerTest, TakesAPackOnceThatIsSentTwiceBeforeItIsRead) {
    storePack(packs_, "p1");
    readersWork_.emplace();
    std::vector<std::string> told;
    for (int i = 0; i < 2; ++i)
        runner_->accept(
            {folder_.path().string(), "packs.db", "p1"}, [](std::string const&) {},
            [&](std::string const& failure) { told.push_back(failure); });
    for (auto const& work : *readersWork_)
        work();
    EXPECT_EQ(told, (std::vector<std::string>{"", ""}));
    EXPECT_EQ(state("p1"), "accepted");
    EXPECT_EQ(work_.size(), 1u);
}

TEST_F(JobRunnerTest, RefusesAPackDatabaseThatOthersMayWrite) {
    storePack(packs_, "p1");
    fs::permissions(folder_.path(), fs::perms(0770));
    EXPECT_EQ(acceptFailure(folder_.path().string(), "packs.db", "p1"),
              "the pack database " + packs_.string() + " is not read, because others may write " +
                  folder_.path().string() + ": take their right away (chmod go-w) [database-unusable]");
    EXPECT_EQ(state("p1"), "none");
}

constexpr auto HOLD = Protocol::JobAction::Hold;
constexpr auto RELEASE = Protocol::JobAction::Release;
constexpr auto CANCEL = Protocol::JobAction::Cancel;
constexpr char const* DONE = "nothing was thrown";

// What a pack preset says about the way of its mailings.

TEST_F(JobRunnerTest, HandsOverByItselfWhatIsToGoAtOnce) {
    acceptStored("p1", R"("process_mode": 3, )");
    doWork();
    EXPECT_EQ(state("p1"), "submitted");
    EXPECT_EQ(contentOf(upload_ / "p1.mailing"), contentOfPack("p1"));
}

TEST_F(JobRunnerTest, KeepsWhatIsToGoAtOnceUntilThereIsAFolder) {
    setSettings("{}");
    acceptStored("p1", R"("process_mode": 2, )");
    doWork();
    EXPECT_EQ(state("p1"), "queued");
    setSettings(R"({"upload_folder":")" + upload_.string() + "\"}");
    runner_->resume();
    doWork();
    EXPECT_EQ(state("p1"), "submitted");
}

TEST_F(JobRunnerTest, HoldsUntilItIsReleasedWhatIsToBeHeldAlsoWithAnUpload) {
    acceptStored("p1", R"("process_mode": 9, )");
    runner_->upload("", "");
    doWork();
    EXPECT_EQ(state("p1"), "held");
    runner_->upload("", "");
    runner_->resume();
    runner_->updateStatus("", "");
    EXPECT_TRUE(work_.empty());
    EXPECT_EQ(change(RELEASE), DONE);
    doWork();
    EXPECT_EQ(state("p1"), "submitted");
    EXPECT_FALSE(isInOutbox());
}

TEST_F(JobRunnerTest, HoldsADelayedMailingUntilItIsDueAlsoWithAnUpload) {
    // 1000 seconds behind midnight: due at the 20th minute.
    acceptStored("p1", R"("delay": {"mins": [20]}, )");
    runner_->upload("", "");
    doWork();
    EXPECT_EQ(state("p1"), "held");
    EXPECT_EQ(jobs_.find("p1")->due, 1200);
    now_ = 1199;
    runner_->releaseDue();
    EXPECT_EQ(state("p1"), "held");
    now_ = 1200;
    runner_->releaseDue();
    doWork();
    EXPECT_EQ(state("p1"), "submitted");
}

TEST_F(JobRunnerTest, LetsADelayedMailingWaitForAnUploadWhenItIsDue) {
    acceptStored("p1", R"("delay": {"mins": [20]}, )");
    doWork();
    now_ = 1200;
    runner_->resume();
    doWork();
    EXPECT_EQ(state("p1"), "queued");
}

TEST_F(JobRunnerTest, ReleasesAMailingInFrontOfItsTime) {
    acceptStored("p1", R"("delay": {"mins": [20]}, "process_mode": 2, )");
    doWork();
    EXPECT_EQ(change(RELEASE), DONE);
    doWork();
    EXPECT_EQ(state("p1"), "submitted");
}

TEST_F(JobRunnerTest, ReleasesWhatIsNotHeldYet) {
    acceptStored("p1", R"("delay": {"mins": [20]}, "process_mode": 8, )");
    EXPECT_EQ(change(RELEASE), DONE);
    doWork();
    EXPECT_EQ(state("p1"), "queued");
}

TEST_F(JobRunnerTest, HandsNothingOverOfATrialRun) {
    acceptStored("p1", R"("process_mode": 131, )");
    runner_->upload("", "");
    doWork();
    EXPECT_EQ(state("p1"), "tried");
    EXPECT_EQ(contentOf(outbox_ / "p1.mailing"), contentOfPack("p1"));
    runner_->upload("", "");
    runner_->updateStatus("", "");
    doWork();
    EXPECT_EQ(state("p1"), "tried");
    EXPECT_TRUE(fs::is_empty(upload_));
    for (auto const action : {HOLD, RELEASE, CANCEL})
        EXPECT_EQ(change(action), "it is too late to " + std::string(actionName(action)) +
                                      " mailing p1: it was a trial run, which hands nothing over");
}

TEST_F(JobRunnerTest, HoldsAMailingThatWaitsToBeHandedOver) {
    acceptStored("p1");
    EXPECT_EQ(change(HOLD), DONE);
    doWork();
    EXPECT_EQ(state("p1"), "held");
    EXPECT_EQ(change(RELEASE), DONE);
    EXPECT_EQ(state("p1"), "queued");
    EXPECT_EQ(change(HOLD), DONE);
    EXPECT_EQ(change(HOLD), DONE);
    EXPECT_EQ(state("p1"), "held");
    runner_->upload("", "");
    doWork();
    EXPECT_EQ(state("p1"), "held");
}

TEST_F(JobRunnerTest, KeepsADelayedMailingThatAPersonHolds) {
    acceptStored("p1", R"("delay": {"mins": [20]}, )");
    doWork();
    EXPECT_EQ(change(HOLD), DONE);
    now_ = 5000;
    runner_->releaseDue();
    EXPECT_EQ(state("p1"), "held");
}

TEST_F(JobRunnerTest, TakesBackACopyThatIsBeingMadeOfAMailingThatAPersonHolds) {
    acceptStored("p1");
    doWork();
    runner_->upload("", "");
    EXPECT_EQ(change(HOLD), DONE);
    doWork();
    EXPECT_EQ(state("p1"), "held");
    EXPECT_FALSE(isStaged());
    EXPECT_TRUE(isInOutbox());
    EXPECT_EQ(change(RELEASE), DONE);
    doWork();
    EXPECT_EQ(state("p1"), "submitted");
}

TEST_F(JobRunnerTest, CallsAMailingBackWhereverItIsUntilItIsHandedOver) {
    acceptStored("p1");
    EXPECT_EQ(change(CANCEL), DONE);
    doWork();
    EXPECT_EQ(state("p1"), "cancelled");
    EXPECT_FALSE(isInOutbox());
    EXPECT_EQ(change(CANCEL), DONE);
    EXPECT_EQ(acceptFailure(folder_.path().string(), "packs.db", "p1"),
              "pack p1 was cancelled: mail its letters anew [state-refused]");

    acceptStored("p2");
    doWork();
    EXPECT_EQ(change(CANCEL, "p2"), DONE);
    EXPECT_FALSE(fs::exists(outbox_ / "p2.mailing"));

    acceptStored("p3", R"("process_mode": 8, )");
    doWork();
    EXPECT_EQ(change(CANCEL, "p3"), DONE);
    EXPECT_EQ(state("p3"), "cancelled");
    EXPECT_FALSE(fs::exists(outbox_ / "p3.mailing"));
    runner_->upload("", "");
    doWork();
    EXPECT_EQ(filesInUpload(), 0);
}

TEST_F(JobRunnerTest, CallsAMailingBackWhoseCopyIsBeingMade) {
    acceptStored("p1");
    doWork();
    runner_->upload("", "");
    EXPECT_EQ(change(CANCEL), DONE);
    EXPECT_TRUE(isInOutbox());
    doWork();
    EXPECT_EQ(state("p1"), "cancelled");
    EXPECT_FALSE(isStaged());
    EXPECT_FALSE(isInOutbox());
    EXPECT_EQ(filesInUpload(), 0);
}

TEST_F(JobRunnerTest, SaysWhoHasAMailingThatCannotBeCalledBack) {
    acceptStored("p1");
    doWork();
    stageOnRecord();
    std::string const late = "it is too late to cancel mailing p1: ";
    EXPECT_EQ(change(CANCEL), late + "it is being handed over to the upload folder " + upload_.string());
    runner_->resume();
    EXPECT_TRUE(
        change(CANCEL).starts_with(late + "the upload folder " + upload_.string() + " has it since "));
    fs::remove(upload_ / "p1.mailing");
    runner_->updateStatus("", "");
    EXPECT_EQ(change(CANCEL), late + "the carrier has taken it from the upload folder " + upload_.string());
    std::ofstream(upload_ / "p1.mailing.status") << R"({"state":"delivered"})";
    runner_->updateStatus("", "");
    EXPECT_EQ(change(CANCEL), late + "the carrier has delivered it");
    EXPECT_EQ(change(HOLD), "it is too late to hold mailing p1: the carrier has delivered it");
    acceptStored("bad");
    run("UPDATE pages SET data = 'x' WHERE pack = 'bad' AND position = 0");
    doWork();
    EXPECT_EQ(
        change(CANCEL, "bad"),
        "it is too late to cancel mailing bad: it was given up: page 1 of the pack is not a compressed page");
    EXPECT_EQ(change(RELEASE, "none"), "there is no mailing none");
}

// A process that was killed in each of the states, and behind each change.

TEST_F(JobRunnerTest, HoldsBehindARestartWhatWasToBeHeld) {
    acceptStored("p1", R"("process_mode": 8, )");
    restart();
    EXPECT_EQ(state("p1"), "held");
    restart();
    EXPECT_EQ(state("p1"), "held");
    EXPECT_EQ(change(RELEASE), DONE);
    restart();
    EXPECT_EQ(state("p1"), "queued");
}

TEST_F(JobRunnerTest, ReleasesBehindARestartWhatBecameDueMeanwhile) {
    acceptStored("p1", R"("delay": {"mins": [20]}, "process_mode": 3, )");
    doWork();
    restart();
    EXPECT_EQ(state("p1"), "held");
    now_ = 9000;
    restart();
    EXPECT_EQ(state("p1"), "submitted");
}

TEST_F(JobRunnerTest, PassesOverADelayThatEndedBeforeItsContainerWasMade) {
    acceptStored("p1", R"("delay": {"mins": [20]}, )");
    now_ = 1200;
    restart();
    EXPECT_EQ(state("p1"), "queued");
}

TEST_F(JobRunnerTest, KeepsTrialsAndCancelledMailingsBehindARestart) {
    acceptStored("p1", R"("process_mode": 128, )");
    restart();
    EXPECT_EQ(state("p1"), "tried");
    restart();
    EXPECT_EQ(state("p1"), "tried");
    EXPECT_TRUE(isInOutbox());
    acceptStored("p2");
    EXPECT_EQ(change(CANCEL, "p2"), DONE);
    restart();
    EXPECT_EQ(state("p2"), "cancelled");
    EXPECT_FALSE(fs::exists(outbox_ / "p2.mailing"));
}

TEST_F(JobRunnerTest, GoesOnBehindTheHandingOverWhereItWas) {
    for (char const* id : {"waits", "taken", "done", "returned"})
        acceptStored(id);
    runner_->upload("", "");
    doWork();
    restart();
    for (char const* id : {"taken", "done", "returned"})
        fs::remove(upload_ / (id + std::string(".mailing")));
    runner_->updateStatus("", "");
    EXPECT_EQ(state("waits"), "submitted");
    restart();
    EXPECT_EQ(state("taken"), "lodged");
    std::ofstream(upload_ / "done.mailing.status") << R"({"state":"delivered"})";
    std::ofstream(upload_ / "returned.mailing.status") << R"({"state":"failed","text":"no such street"})";
    runner_->updateStatus("", "");
    for (int restarts = 0; restarts < 2; ++restarts) {
        restart();
        EXPECT_EQ(state("waits"), "submitted");
        EXPECT_EQ(state("taken"), "lodged");
        EXPECT_EQ(state("done"), "delivered");
        EXPECT_EQ(state("returned"), "failed: the carrier: no such street");
    }
    EXPECT_TRUE(fs::exists(upload_ / "waits.mailing"));
    EXPECT_FALSE(fs::exists(outbox_ / "waits.mailing"));
}

TEST_F(JobRunnerTest, RemovesBehindARestartWhatIsLeftOfACancelledMailing) {
    acceptStored("p1");
    doWork();
    VlServiced::stage(outbox_ / "p1.mailing", UploadFolder(upload_, {}), fence());
    jobs_.cancel("p1", now_);
    restart();
    EXPECT_FALSE(isStaged());
    EXPECT_FALSE(isInOutbox());
    EXPECT_FALSE(isHandedOver());
}

// What the settings of the node allow, whatever the client has decided.

TEST_F(JobRunnerTest, RefusesWhatTheSettingsDoNotAllow) {
    rules_.maxLetterSheets = {2, "u=bob/a=acme"};
    storePack(packs_, "p1");
    EXPECT_EQ(
        acceptFailure(folder_.path().string(), "packs.db", "p1"),
        "too-many-sheets: 3 sheets, 2 allowed by u=bob/a=acme; pack p1 is not taken [refused-by-settings]");
    EXPECT_EQ(state("p1"), "none");
    storePack(packs_, "both sides", "a=acme", R"("duplex": true, )");
    EXPECT_EQ(acceptFailure(folder_.path().string(), "packs.db", "both sides"), DONE);
    rules_.enforcesProfile = {true, "the root"};
    storePack(packs_, "p2", "a=acme", R"("delay": {"week_days": [9]}, )");
    EXPECT_EQ(acceptFailure(folder_.path().string(), "packs.db", "p2"),
              "profile-not-listed: no profile, none allowed by the root; delay-impossible: 9 in "
              "\"week_days\", 0 to 6 "
              "possible, as set by a=acme for Bills; too-many-sheets: 3 sheets, 2 allowed by u=bob/a=acme; "
              "pack p2 is "
              "not taken [refused-by-settings]");
    EXPECT_EQ(used_, std::vector<std::string>{"a=acme Bills"});
}

TEST_F(JobRunnerTest, RefusesMetadataThatIsNone) {
    storePack(packs_, "p1");
    run("UPDATE packs SET metadata = 'x'");
    EXPECT_EQ(acceptFailure(folder_.path().string(), "packs.db", "p1"),
              "the metadata of pack p1 is none of a mailing [mailing-damaged]");
    EXPECT_EQ(state("p1"), "none");
}

TEST_F(JobRunnerTest, WritesWhatTheSettingsDecideIntoTheMetadata) {
    rules_.purchaseOrder = "P-1";
    rules_.priority = Cfg::PriorityDelivery{2};
    acceptStored("p1");
    doWork();
    PackWrapper container((outbox_ / "p1.mailing").string(), PackWrapper::PURPOSE_IMPORT, "");
    json::Object const metadata = parse(unzipped(container.inputFullMeta()));
    EXPECT_EQ(metadata.get("purchase_order"), json::Value("P-1"));
    EXPECT_TRUE(metadata.get("priority_delivery").isTrue());
    EXPECT_EQ(metadata.get("title"), json::Value("metadata of p1"));
}

} // namespace
