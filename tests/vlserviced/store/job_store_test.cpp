#include "programs/vlserviced/store/job_store.h"

#include "tests/vlserviced/store_database.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sqlite3.h>

#include <functional>
#include <iterator>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using VlServiced::Job;
using VlServiced::JobFilter;
using VlServiced::JobKey;
using VlServiced::JobState;
using VlServiced::JobStore;

class JobStoreTest : public VLServiceTest::OnEachDatabase {
protected:
    static Job job(std::string const& packId, long long acceptedAt = 100) {
        Job job;
        job.pack = {"/srv/packs", "packs.db", packId};
        job.cfgId = "a=acme";
        job.title = "Bills of March";
        job.documents = 2;
        job.pages = 7;
        job.acceptedAt = acceptedAt;
        return job;
    }
    static std::vector<std::string> ids(std::vector<Job> const& jobs) {
        std::vector<std::string> all;
        for (Job const& job : jobs)
            all.push_back(job.pack.packId);
        return all;
    }

    JobStore store_{*database_};
};

TEST_P(JobStoreTest, RecordsAJobAsAccepted) {
    EXPECT_TRUE(store_.accept(job("p1")));
    Job const found = store_.find("p1").value();
    EXPECT_EQ(found.pack, job("p1").pack);
    EXPECT_EQ(found.cfgId, "a=acme");
    EXPECT_EQ(found.title, "Bills of March");
    EXPECT_EQ(found.documents, 2);
    EXPECT_EQ(found.pages, 7);
    EXPECT_EQ(found.state, JobState::Accepted);
    EXPECT_EQ(found.problem, "");
    EXPECT_FALSE(found.toUpload);
    EXPECT_EQ(found.acceptedAt, 100);
    EXPECT_EQ(found.changedAt, 100);
    EXPECT_FALSE(store_.find("p2"));
}

TEST_P(JobStoreTest, RecordsAPackIdOnce) {
    EXPECT_TRUE(store_.accept(job("p1")));
    store_.advance("p1", JobState::Accepted, JobState::Queued, 150);
    EXPECT_FALSE(store_.accept(job("p1", 200)));
    EXPECT_EQ(store_.find("p1")->acceptedAt, 100);
    EXPECT_EQ(store_.find("p1")->state, JobState::Queued);
}

TEST_P(JobStoreTest, MovesAJobOnFromTheStateThatItIsInAlone) {
    store_.accept(job("p1"));
    EXPECT_FALSE(store_.advance("p1", JobState::Queued, JobState::Submitting, 150));
    EXPECT_EQ(store_.find("p1")->changedAt, 100);
    store_.setProblem("p1", "waits");
    EXPECT_TRUE(store_.advance("p1", JobState::Accepted, JobState::Queued, 150));
    EXPECT_FALSE(store_.advance("p1", JobState::Accepted, JobState::Queued, 160));
    EXPECT_EQ(store_.find("p1")->state, JobState::Queued);
    EXPECT_EQ(store_.find("p1")->changedAt, 150);
    EXPECT_EQ(store_.find("p1")->problem, "");
    EXPECT_FALSE(store_.advance("p2", JobState::Accepted, JobState::Queued, 150));
}

TEST_P(JobStoreTest, RecordsWhereAContainerGoesBeforeItGoesThere) {
    store_.accept(job("p1"));
    EXPECT_FALSE(store_.beginSubmitting("p1", "/srv/upload", "2 7 mark", 140));
    store_.advance("p1", JobState::Accepted, JobState::Queued, 150);
    EXPECT_TRUE(store_.beginSubmitting("p1", "/srv/upload", "2 7 mark", 160));
    EXPECT_FALSE(store_.beginSubmitting("p1", "/srv/other", "", 170));
    EXPECT_EQ(store_.find("p1")->state, JobState::Submitting);
    EXPECT_EQ(store_.find("p1")->uploadFolder, "/srv/upload");
    EXPECT_EQ(store_.find("p1")->uploadFolderIdentity, "2 7 mark");
    EXPECT_EQ(store_.find("p1")->changedAt, 160);
}

TEST_P(JobStoreTest, CountsTheJobsOfEachState) {
    for (auto const* id : {"a", "b", "c"})
        store_.accept(job(id));
    store_.fail("b", "", 5);
    EXPECT_THAT(store_.counts(), testing::UnorderedElementsAre(testing::Pair(JobState::Accepted, 2),
                                                               testing::Pair(JobState::Failed, 1)));
}

TEST_P(JobStoreTest, GivesAJobUpWithTheReason) {
    store_.accept(job("p1"));
    store_.fail("p1", "page 2 is missing", 150);
    EXPECT_EQ(store_.find("p1")->state, JobState::Failed);
    EXPECT_EQ(store_.find("p1")->problem, "page 2 is missing");
    EXPECT_EQ(store_.find("p1")->changedAt, 150);
}

TEST_P(JobStoreTest, ListsAStateInTheOrderOfAcceptance) {
    store_.accept(job("b", 2));
    store_.accept(job("a", 3));
    store_.accept(job("c", 1));
    store_.advance("b", JobState::Accepted, JobState::Queued, 4);
    EXPECT_THAT(ids(store_.inState(JobState::Accepted)), ElementsAre("c", "a"));
    EXPECT_THAT(ids(store_.inState(JobState::Queued)), ElementsAre("b"));
    EXPECT_THAT(ids(store_.inState(JobState::Failed)), IsEmpty());
}

TEST_P(JobStoreTest, FindsTheJobsOfAPackDatabase) {
    store_.accept(job("p1", 1));
    store_.accept(job("p2", 2));
    Job other = job("p3", 3);
    other.pack.folder = "/srv/other";
    store_.accept(other);
    EXPECT_THAT(ids(store_.matching({}, 10)), ElementsAre("p1", "p2", "p3"));
    EXPECT_THAT(ids(store_.matching({}, 2)), ElementsAre("p2", "p3"));
    EXPECT_THAT(ids(store_.matching({"/srv/packs", "", {}}, 10)), ElementsAre("p1", "p2"));
    EXPECT_THAT(ids(store_.matching({"", "other.db", {}}, 10)), IsEmpty());
    EXPECT_THAT(ids(store_.matching({"/srv/packs", "packs.db", {"p2", "p3"}}, 10)), ElementsAre("p2"));
    EXPECT_THAT(ids(store_.matching({"", "", {"p1", "p9"}}, 1)), ElementsAre("p1"));
}

TEST_P(JobStoreTest, MarksForUploadWhatIsNotHandedOnYet) {
    for (auto const* id : {"accepted", "queued", "submitted", "held"})
        store_.accept(job(id));
    store_.advance("held", JobState::Accepted, JobState::Held, 2);
    for (auto const* id : {"queued", "submitted"})
        store_.advance(id, JobState::Accepted, JobState::Queued, 2);
    store_.advance("submitted", JobState::Queued, JobState::Submitted, 3);
    store_.wantUpload("/srv/elsewhere", "");
    EXPECT_FALSE(store_.find("accepted")->toUpload);
    store_.wantUpload("/srv/packs", "packs.db");
    EXPECT_TRUE(store_.find("accepted")->toUpload);
    EXPECT_TRUE(store_.find("queued")->toUpload);
    EXPECT_TRUE(store_.find("held")->toUpload);
    EXPECT_FALSE(store_.find("submitted")->toUpload);
}

TEST_P(JobStoreTest, RecordsTheCourseOfAJob) {
    Job wanted = job("p1");
    wanted.toUpload = wanted.toHold = wanted.isTrial = true;
    wanted.due = 900;
    store_.accept(wanted);
    Job const found = store_.find("p1").value();
    EXPECT_TRUE(found.toUpload && found.toHold && found.isTrial);
    EXPECT_EQ(found.due, 900);
    store_.accept(job("p2"));
    Job const plain = store_.find("p2").value();
    EXPECT_FALSE(plain.toUpload || plain.toHold || plain.isTrial);
    EXPECT_EQ(plain.due, 0);
}

TEST_P(JobStoreTest, HoldsReleasesAndCallsBackWhatIsNotOnItsWay) {
    struct {
        JobState from;
        JobState held;
        JobState released;
        JobState cancelled;
    } const cases[] = {
        {JobState::Accepted, JobState::Accepted, JobState::Accepted, JobState::Cancelled},
        {JobState::Held, JobState::Held, JobState::Queued, JobState::Cancelled},
        {JobState::Queued, JobState::Held, JobState::Queued, JobState::Cancelled},
        {JobState::Submitting, JobState::Submitting, JobState::Submitting, JobState::Submitting},
        {JobState::Submitted, JobState::Submitted, JobState::Submitted, JobState::Submitted},
        {JobState::Lodged, JobState::Lodged, JobState::Lodged, JobState::Lodged},
        {JobState::Delivered, JobState::Delivered, JobState::Delivered, JobState::Delivered},
        {JobState::Failed, JobState::Failed, JobState::Failed, JobState::Failed},
        {JobState::Cancelled, JobState::Cancelled, JobState::Cancelled, JobState::Cancelled},
        {JobState::Tried, JobState::Tried, JobState::Tried, JobState::Tried},
        {JobState::Delivering, JobState::Delivering, JobState::Delivering, JobState::Delivering},
    };
    static_assert(std::size(cases) == Protocol::ALL_JOB_STATES.size());
    int number = 0;
    auto const behind = [&](JobState from, bool (JobStore::*change)(std::string const&, long long)) {
        std::string const id = "p" + std::to_string(++number);
        Job wanted = job(id);
        wanted.due = 900;
        store_.accept(wanted);
        store_.advance(id, JobState::Accepted, from, 150);
        bool const isChanged = (store_.*change)(id, 160);
        Job const found = store_.find(id).value();
        EXPECT_EQ(found.due, isChanged ? 0 : 900);
        EXPECT_EQ(found.changedAt, found.state == from ? 150 : 160);
        EXPECT_EQ(found.toHold, isChanged && change == &JobStore::hold);
        return found.state;
    };
    for (auto const& [from, held, released, cancelled] : cases) {
        EXPECT_EQ(behind(from, &JobStore::hold), held) << stateName(from);
        EXPECT_EQ(behind(from, &JobStore::release), released) << stateName(from);
        EXPECT_EQ(behind(from, &JobStore::cancel), cancelled) << stateName(from);
    }
}

TEST_P(JobStoreTest, FindsWhatIsHeldAndDueInTheOrderOfItsTime) {
    for (auto const& [id, due] :
         {std::pair{"c", 300LL}, {"a", 500LL}, {"b", 100LL}, {"never", 0LL}, {"queued", 50LL}}) {
        Job held = job(id);
        held.due = due;
        store_.accept(held);
        store_.advance(id, JobState::Accepted,
                       id == std::string("queued") ? JobState::Queued : JobState::Held, 2);
    }
    EXPECT_EQ(store_.nextDue(), 100);
    EXPECT_THAT(ids(store_.due(99, 10)), IsEmpty());
    EXPECT_THAT(ids(store_.due(300, 10)), ElementsAre("b", "c"));
    EXPECT_THAT(ids(store_.due(1000, 2)), ElementsAre("b", "c"));
    for (auto const* id : {"a", "b", "c"})
        store_.advance(id, JobState::Held, JobState::Queued, 3);
    EXPECT_EQ(store_.nextDue(), std::nullopt);
}

TEST_P(JobStoreTest, ListsWhatGoesOnByItselfOfAPackDatabase) {
    for (auto const* id : {"a", "b", "c", "held", "cancelled", "tried"})
        store_.accept(job(id));
    store_.advance("held", JobState::Accepted, JobState::Held, 6);
    store_.advance("cancelled", JobState::Accepted, JobState::Cancelled, 6);
    store_.advance("tried", JobState::Accepted, JobState::Tried, 6);
    store_.fail("b", "gone", 5);
    store_.advance("c", JobState::Accepted, JobState::Delivered, 6);
    EXPECT_THAT(ids(store_.underWay("", "")), ElementsAre("a"));
    EXPECT_THAT(ids(store_.underWay("/srv/packs", "packs.db")), ElementsAre("a"));
    EXPECT_THAT(ids(store_.underWay("/srv/other", "")), IsEmpty());
}

TEST_P(JobStoreTest, TellsOfEachChangeOfAStateOrProblem) {
    std::vector<std::string> told;
    store_.onChange([&](std::string const& packId) { told.push_back(packId); });
    store_.accept(job("p1"));
    EXPECT_THAT(told, IsEmpty());
    store_.advance("p1", JobState::Queued, JobState::Submitting, 1);
    EXPECT_THAT(told, IsEmpty());
    store_.advance("p1", JobState::Accepted, JobState::Queued, 2);
    store_.beginSubmitting("p1", "/srv/upload", "", 3);
    store_.setProblem("p1", "full");
    store_.fail("p1", "gone", 4);
    EXPECT_THAT(told, ElementsAre("p1", "p1", "p1", "p1"));
}

/// A store that is taken hold of under another name.
class OtherStore {
public:
    explicit OtherStore(std::unique_ptr<Database::Connection> database, std::string name = "other")
        : database_(std::move(database)), store_(*database_, {std::move(name), 60}) {}
    JobStore* operator->() { return &store_; }

private:
    std::unique_ptr<Database::Connection> database_;
    JobStore store_;
};

TEST_P(JobStoreTest, GivesEachJobIntoOnePairOfHandsInTheOrderOfTime) {
    for (char const* const id : {"p1", "p2", "p3"})
        store_.accept(job(id));
    database_->run("UPDATE jobs SET try_at = CASE pack WHEN 'p2' THEN 1 WHEN 'p1' THEN 2 ELSE 3 END");
    EXPECT_THAT(ids(store_.claim(1)), ElementsAre("p2"));
    OtherStore other(open());
    EXPECT_THAT(ids(other->claim(16)), ElementsAre("p1", "p3"));
    EXPECT_THAT(store_.claim(16), IsEmpty());
    EXPECT_FALSE(store_.claim("p1"));
    EXPECT_FALSE(other->claim("p2"));
}

TEST_P(JobStoreTest, GivesNoJobIntoHandsThatIsAtRest) {
    for (char const* const id : {"held", "queued", "wanted", "submitted"})
        store_.accept(job(id));
    store_.advance("held", JobState::Accepted, JobState::Held, 1);
    for (char const* const id : {"queued", "wanted", "submitted"})
        store_.advance(id, JobState::Accepted, JobState::Queued, 1);
    store_.wantUpload("wanted");
    store_.beginSubmitting("submitted", "/srv/upload", "", 1);
    store_.advance("submitted", JobState::Submitting, JobState::Submitted, 1);
    EXPECT_THAT(ids(store_.claim(16)), ElementsAre("wanted"));
    EXPECT_FALSE(store_.claim("queued"));
    EXPECT_FALSE(store_.claim("none"));
}

TEST_P(JobStoreTest, HasNothingChangedByWhoStoodStillForTooLong) {
    store_.accept(job("p1"));
    JobKey const former("p1", store_.claim(1).front().fence);
    database_->run("UPDATE jobs SET try_at = 0");
    OtherStore other(open());
    JobKey const latter("p1", other->claim(1).front().fence);
    EXPECT_GT(latter.fence, former.fence);
    EXPECT_FALSE(store_.advance(former, JobState::Accepted, JobState::Queued, 2));
    store_.fail(former, "too late", 2);
    store_.setProblem(former, "too late");
    store_.keep({"p1"});
    store_.letGo(former, 0);
    EXPECT_EQ(store_.find("p1")->state, JobState::Accepted);
    EXPECT_EQ(store_.find("p1")->problem, "");
    EXPECT_FALSE(store_.claim("p1")) << "the other one has it still";
    EXPECT_TRUE(other->advance(latter, JobState::Accepted, JobState::Queued, 2));
    EXPECT_FALSE(store_.beginSubmitting(former, "/srv/upload", "", 3));
    EXPECT_FALSE(store_.divide(former, VlServiced::LettersByCarriers::All, 3));
    EXPECT_TRUE(other->beginSubmitting(latter, "/srv/upload", "", 3));
    EXPECT_EQ(store_.find("p1")->submitFence, latter.fence);
    EXPECT_FALSE(store_.advance(former, JobState::Submitting, JobState::Submitted, 4));
}

TEST_P(JobStoreTest, HoldsAJobOnAndLetsGoOfIt) {
    store_.accept(job("p1"));
    JobKey const mine("p1", store_.claim(1).front().fence);
    database_->run("UPDATE jobs SET try_at = 0");
    store_.keep({"p1", "none"});
    OtherStore other(open());
    EXPECT_THAT(other->claim(16), IsEmpty());
    store_.letGo(mine, 60);
    EXPECT_THAT(other->claim(16), IsEmpty()) << "something is in its way";
    store_.hurry();
    EXPECT_THAT(ids(other->claim(16)), ElementsAre("p1"));
    EXPECT_FALSE(store_.claim("p1"));
    other->letGo("p1", 60);
    EXPECT_TRUE(store_.claim("p1")) << "whoever asks for it need not wait";
}

/// How many tens of steps the database takes for a question.
class StepCounter {
public:
    explicit StepCounter(Database::Connection& database)
        : database_(static_cast<Database::SqliteConnection&>(database).file()) {
        sqlite3_progress_handler(database_.getHandle(), 10, &StepCounter::count, this);
    }
    ~StepCounter() { sqlite3_progress_handler(database_.getHandle(), 0, nullptr, nullptr); }
    StepCounter(StepCounter const&) = delete;
    StepCounter& operator=(StepCounter const&) = delete;
    int steps() const { return steps_; }

private:
    static int count(void* self) {
        ++static_cast<StepCounter*>(self)->steps_;
        return 0;
    }

    SQLite::Database& database_;
    int steps_ = 0;
};

/// As SQLite counts them.
class JobStoreCosts : public JobStoreTest {};

TEST_P(JobStoreCosts, AnswersAQuestionAtTheSameCostHoweverManyJobsThereAre) {
    JobFilter const filters[] = {
        {"", "", {"job 7", "job 8"}},
        {"/srv/packs", "packs.db", {"job 7"}},
        {},
        {"/srv/packs", "packs.db", {}},
    };
    auto const addJobs = [this](int from, int to) {
        Database::Transaction transaction(*database_);
        for (int i = from; i < to; ++i)
            store_.accept(job("job " + std::to_string(i), i));
        transaction.commit();
    };
    auto const steps = [this](JobFilter const& filter) {
        StepCounter const counter(*database_);
        store_.matching(filter, 10);
        return counter.steps();
    };
    addJobs(0, 50);
    std::vector<int> few;
    for (JobFilter const& filter : filters)
        few.push_back(steps(filter));
    addJobs(50, 3000);
    for (std::size_t i = 0; i < few.size(); ++i)
        EXPECT_NEAR(steps(filters[i]), few[i], 2) << i;
}

TEST_P(JobStoreCosts, LooksForWhatIsDueAtTheSameCostHoweverManyJobsAreHeld) {
    auto const addHeld = [this](int from, int to) {
        Database::Transaction transaction(*database_);
        for (int i = from; i < to; ++i) {
            Job held = job("job " + std::to_string(i), i);
            held.due = 1000 + i;
            store_.accept(held);
            store_.advance(held.pack.packId, JobState::Accepted, JobState::Held, i);
        }
        transaction.commit();
    };
    auto const steps = [this](auto const& question) {
        StepCounter const counter(*database_);
        question();
        return counter.steps();
    };
    std::function<void()> const questions[] = {
        [this] { store_.due(1004, 100); },
        [this] { store_.nextDue(); },
        [this] { store_.underWay("", ""); },
        [this] { store_.underWay("/srv/packs", "packs.db"); },
        [this] { store_.inState(JobState::Queued); },
    };
    addHeld(0, 50);
    std::vector<int> few;
    for (auto const& question : questions)
        few.push_back(steps(question));
    addHeld(50, 3000);
    for (std::size_t i = 0; i < few.size(); ++i)
        EXPECT_NEAR(steps(questions[i]), few[i], 2) << i;
}

TEST_P(JobStoreCosts, OrdersWhatIsDueByItsIndexAlone) {
    Database::Rows plan = database_->query("EXPLAIN QUERY PLAN SELECT pack FROM jobs INDEXED BY jobs_by_due "
                                           "WHERE state = 'held' AND due <= 7 ORDER BY due, pack");
    std::vector<std::string> steps;
    while (plan.next())
        steps.push_back(plan.text(3));
    EXPECT_THAT(steps, ElementsAre("SEARCH jobs USING INDEX jobs_by_due (due<?)"));
}

TEST_P(JobStoreCosts, LooksForWhatIsToBeWorkedOnByTheIndexThatHoldsThat) {
    Database::Rows plan = database_->query(
        "EXPLAIN QUERY PLAN SELECT pack FROM jobs INDEXED BY jobs_to_claim WHERE (state IN ('accepted', "
        "'submitting') OR (state = 'queued' AND to_upload = 1)) AND try_at <= 5 ORDER BY try_at, pack LIMIT "
        "3");
    std::vector<std::string> steps;
    while (plan.next())
        steps.push_back(plan.text(3));
    EXPECT_THAT(steps, ElementsAre("SEARCH jobs USING INDEX jobs_to_claim (try_at<?)"));
}

VLSERVICE_ON_EACH_DATABASE(JobStoreTest);
INSTANTIATE_TEST_SUITE_P(On, JobStoreCosts, testing::Values(Database::Backend::Sqlite),
                         VLServiceTest::OnEachDatabase::nameOf);

} // namespace
