#include "programs/vlserviced/jobs/job_list.h"

#include "programs/vlserviced/store/schema.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/json_help.h"

#include <gtest/gtest.h>

namespace {

using VlServiced::Job;
using VlServiced::JobState;

class JobList : public testing::Test {
protected:
    void add(std::string const& packId, long long acceptedAt) {
        Job job;
        job.pack = {"/srv/packs", "packs.db", packId};
        job.cfgId = "a=acme";
        job.title = "Bills";
        job.documents = 1;
        job.pages = 2;
        job.acceptedAt = acceptedAt;
        jobs_.accept(job);
    }
    json::Object list(std::string const& query, long long now = 0) {
        return listJobs(Protocol::JobsQuery(parse(query)), jobs_, letters_, settings_, "/var/outbox", now,
                        Policy::Grant::ofService())
            .serialize();
    }
    std::string ids(std::string const& query) {
        std::string all;
        for (json::Value const& job : list(query).get("jobs").toArray())
            all += job.toObject().get("id").textOrEmpty() + " ";
        return all;
    }
    json::Value keyOf(char const* packId, char const* key, long long now) {
        return list(R"({"states":["held","cancelled","tried"],"ids":[")" + std::string(packId) + "\"]}", now)
            .get("jobs")
            .toArray()
            .at(0)
            .toObject()
            .get(key);
    }

    TemporaryFolder folder_;
    std::unique_ptr<Database::Connection> database_ = VlServiced::openServiceDatabase(folder_ / "service.db");
    VlServiced::JobStore jobs_{*database_};
    VlServiced::LetterStore letters_{*database_, jobs_};
    VlServiced::SettingsStore store_{*database_};
    VlServiced::SettingsService settings_{store_};
};

TEST_F(JobList, TellsEverythingOfAJob) {
    add("p1", 100);
    EXPECT_EQ(
        print(list("{}")),
        R"({"jobs":[{"id":"p1","state":"accepted","title":"Bills","cfg_id":"a=acme","db_host":"/srv/packs",)"
        R"("db_name":"packs.db","documents":1,"pages":2,"accepted":100,"changed":100}]})");
    jobs_.setProblem("p1", "the disk is full");
    jobs_.wantUpload("", "");
    EXPECT_EQ(keyOf("p1", "problem", 0), json::Value("the disk is full"));
    EXPECT_TRUE(keyOf("p1", "to_upload", 0).isTrue());
}

TEST_F(JobList, IsNarrowedByDatabaseIdsAndNumber) {
    add("p1", 1);
    add("p2", 2);
    add("p3", 3);
    EXPECT_EQ(ids("{}"), "p1 p2 p3 ");
    EXPECT_EQ(ids(R"({"limit":2})"), "p2 p3 ");
    EXPECT_EQ(ids(R"({"ids":["p3","p1","p9"]})"), "p1 p3 ");
    EXPECT_EQ(ids(R"({"db_host":"/srv/packs","db_name":"packs.db"})"), "p1 p2 p3 ");
    EXPECT_EQ(ids(R"({"db_host":"/srv"})"), "");
}

TEST_F(JobList, NamesTheContainerWhereItLies) {
    add("p1", 1);
    EXPECT_FALSE(keyOf("p1", "container", 0));
    jobs_.advance("p1", JobState::Accepted, JobState::Queued, 2);
    EXPECT_EQ(keyOf("p1", "container", 0), json::Value("/var/outbox/p1.mailing"));
    jobs_.beginSubmitting("p1", "/srv/upload", "", 3);
    EXPECT_EQ(keyOf("p1", "container", 0), json::Value("/var/outbox/p1.mailing"));
    jobs_.advance("p1", JobState::Submitting, JobState::Submitted, 4);
    EXPECT_EQ(keyOf("p1", "container", 0), json::Value("/srv/upload/p1.mailing"));
    jobs_.advance("p1", JobState::Submitted, JobState::Lodged, 5);
    EXPECT_FALSE(keyOf("p1", "container", 0));
}

TEST_F(JobList, RaisesAnAlarmByTheHoursOfTheNode) {
    constexpr long long HOUR = 3600;
    settings_.setPart("a=acme", "inet", parse(R"({"lodged_alarm_hours":24})"));
    add("p1", 0);
    EXPECT_FALSE(keyOf("p1", "alarm", 1000 * HOUR));
    jobs_.advance("p1", JobState::Accepted, JobState::Submitted, 0);
    EXPECT_FALSE(keyOf("p1", "alarm", 4 * HOUR - 1));
    EXPECT_EQ(keyOf("p1", "alarm", 4 * HOUR),
              json::Value("nobody has taken the container from the upload folder for 4 hours"));
    jobs_.advance("p1", JobState::Submitted, JobState::Lodged, 0);
    EXPECT_FALSE(keyOf("p1", "alarm", 24 * HOUR - 1));
    EXPECT_EQ(keyOf("p1", "alarm", 30 * HOUR), json::Value("the carrier has not reported for 30 hours"));
    settings_.setPart("a=acme", "inet", parse(R"({"lodged_alarm_hours":0})"));
    EXPECT_FALSE(keyOf("p1", "alarm", 1000 * HOUR));
}

TEST_F(JobList, TellsUntilWhenAJobIsHeld) {
    Job job;
    job.pack = {"/srv/packs", "packs.db", "p1"};
    job.due = 5000;
    jobs_.accept(job);
    EXPECT_EQ(keyOf("p1", "due", 0), json::Value(5000));
    jobs_.advance("p1", JobState::Accepted, JobState::Held, 200);
    EXPECT_EQ(keyOf("p1", "due", 0), json::Value(5000));
    EXPECT_EQ(keyOf("p1", "container", 0), json::Value("/var/outbox/p1.mailing"));
    jobs_.advance("p1", JobState::Held, JobState::Queued, 200);
    EXPECT_FALSE(keyOf("p1", "due", 0));
}

TEST_F(JobList, TellsLaterStatesToClientsThatKnowThem) {
    for (auto const& [id, state] :
         {std::pair{"p1", JobState::Held}, {"p2", JobState::Cancelled}, {"p3", JobState::Tried}}) {
        add(id, 100);
        jobs_.advance(id, JobState::Accepted, state, 200);
    }
    auto const states = [&](std::string const& query) {
        std::string all;
        for (json::Value const& job : list(query).get("jobs").toArray())
            all += job.toObject().get("state").textOrEmpty() + ' ' +
                   job.toObject().get("problem").textOrEmpty() + ';';
        return all;
    };
    EXPECT_EQ(states(R"({"states":["held","cancelled","tried"]})"), "held ;cancelled ;tried ;");
    EXPECT_EQ(states("{}"), "queued ;failed it was cancelled;queued ;");
}

TEST_F(JobList, TellsThatThereIsNoFolderForWhatIsToBeHandedOver) {
    add("p1", 100);
    jobs_.advance("p1", JobState::Accepted, JobState::Queued, 200);
    EXPECT_FALSE(keyOf("p1", "alarm", 0));
    jobs_.wantUpload("", "");
    EXPECT_EQ(keyOf("p1", "alarm", 0), json::Value("the service has no upload folder"));
    settings_.changeService(parse(R"({"upload_folder":")" + folder_.path().string() + "\"}"));
    EXPECT_FALSE(keyOf("p1", "alarm", 0));
}

} // namespace
