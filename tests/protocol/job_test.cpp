#include "programs/protocol/job.h"

#include "programs/protocol/query.h"
#include "tests/support/failure_of.h"
#include "tests/vlserviced/json_help.h"

#include <gtest/gtest.h>

namespace {

using Protocol::JobReport;
using Protocol::JobsAnswer;
using Protocol::JobsQuery;
using Protocol::JobState;

TEST(JobStates, AreKeptAndToldByTheirNames) {
    std::pair<JobState, char const*> const names[] = {
        {JobState::Accepted, "accepted"},     {JobState::Held, "held"},
        {JobState::Queued, "queued"},         {JobState::Submitting, "submitting"},
        {JobState::Submitted, "submitted"},   {JobState::Lodged, "lodged"},
        {JobState::Delivered, "delivered"},   {JobState::Failed, "failed"},
        {JobState::Cancelled, "cancelled"},   {JobState::Tried, "tried"},
        {JobState::Delivering, "delivering"},
    };
    EXPECT_EQ(std::size(names), Protocol::ALL_JOB_STATES.size());
    for (auto const& [state, name] : names) {
        EXPECT_STREQ(Protocol::stateName(state), name);
        EXPECT_EQ(Protocol::stateNamed(name), state);
    }
    EXPECT_EQ(failureOf([] { Protocol::stateNamed("lost"); }),
              "there is a job in the state \"lost\", which this program does not know: use the version that "
              "wrote it");
}

TEST(JobStates, AreToldToClientsThatDoNotKnowThemAsTheNearestOne) {
    EXPECT_EQ(Protocol::laterStates(),
              (std::vector<std::string>{"held", "cancelled", "tried", "delivering"}));
    for (JobState const state : Protocol::ALL_JOB_STATES)
        EXPECT_EQ(Protocol::toldTo(Protocol::laterStates(), state), state);
    EXPECT_EQ(Protocol::toldTo({}, JobState::Held), JobState::Queued);
    EXPECT_EQ(Protocol::toldTo({"held", "some"}, JobState::Held), JobState::Held);
    EXPECT_EQ(Protocol::toldTo({"held"}, JobState::Tried), JobState::Queued);
    EXPECT_EQ(Protocol::toldTo({}, JobState::Delivering), JobState::Submitted);
    EXPECT_EQ(Protocol::toldTo({"held"}, JobState::Cancelled), JobState::Failed);
    EXPECT_EQ(Protocol::toldTo({}, JobState::Submitted), JobState::Submitted);
}

TEST(JobsQueryReading, KnowsNoLaterStatesOfAClientThatNamesNone) {
    EXPECT_TRUE(JobsQuery(parse(R"({"query":"jobs"})")).knownStates.empty());
}

TEST(JobsQueryReading, RefusesWrongTypes) {
    struct {
        char const* query;
        char const* message;
    } const cases[] = {
        {R"({"db_host":7})", R"("db_host" of a query for jobs has to be a text)"},
        {R"({"db_name":null})", R"("db_name" of a query for jobs has to be a text)"},
        {R"({"ids":"p1"})", R"("ids" of a query for jobs has to be an array of at most 1000 texts)"},
        {R"({"ids":[1]})", R"("ids" of a query for jobs has to be an array of at most 1000 texts)"},
        {R"({"limit":0})", R"("limit" of a query for jobs has to be an integer above 0)"},
        {R"({"limit":"9"})", R"("limit" of a query for jobs has to be an integer above 0)"},
        {R"({"states":"held"})", R"("states" of a query for jobs has to be an array of at most 100 texts)"},
        {R"({"wait":-1})", R"("wait" of a query for jobs has to be an integer above -1)"},
    };
    for (auto const& [query, message] : cases)
        EXPECT_EQ(failureOf([&query = query] { JobsQuery{parse(query)}; }), message);
}

TEST(JobsQueryWriting, SaysWhatIsAskedAndNoMore) {
    EXPECT_EQ(print(JobsQuery().serialize()),
              R"({"query":"jobs","states":["held","cancelled","tried","delivering"]})");
    JobsQuery query;
    query.folder = "/srv";
    query.database = "packs.db";
    query.ids = {"p1", "p2"};
    query.limit = 5;
    query.wait = 100;
    std::string const text =
        R"({"query":"jobs","db_host":"/srv","db_name":"packs.db","ids":["p1","p2"],"limit":5,"wait":100,)"
        R"("states":["held","cancelled","tried","delivering"]})";
    EXPECT_EQ(print(query.serialize()), text);
    EXPECT_EQ(print(JobsQuery(query.serialize()).serialize()), text);
    EXPECT_EQ(Protocol::kindOf(query.serialize()), JobsQuery::KIND);
}

TEST(JobReportReading, TakesWhatAServiceAnswers) {
    std::string const text =
        R"({"jobs":[{"id":"p1","state":"queued","title":"Bills","cfg_id":"a=acme","db_host":"/srv",)"
        R"("db_name":"packs.db","documents":1,"pages":2,"accepted":3,"changed":4,"problem":"full",)"
        R"("alarm":"long","to_upload":true,"due":77,"container":"/out/p1.mailing"}]})";
    JobsAnswer const answer(parse(text));
    ASSERT_EQ(answer.jobs.size(), 1u);
    JobReport const& job = answer.jobs.front();
    EXPECT_EQ(job.id, "p1");
    EXPECT_EQ(job.state, JobState::Queued);
    EXPECT_EQ(job.title, "Bills");
    EXPECT_EQ(job.cfgId, "a=acme");
    EXPECT_EQ(job.folder, "/srv");
    EXPECT_EQ(job.database, "packs.db");
    EXPECT_EQ(job.documents, 1);
    EXPECT_EQ(job.pages, 2);
    EXPECT_EQ(job.accepted, 3);
    EXPECT_EQ(job.changed, 4);
    EXPECT_EQ(job.problem, "full");
    EXPECT_EQ(job.alarm, "long");
    EXPECT_TRUE(job.toUpload);
    EXPECT_EQ(job.due, 77);
    EXPECT_EQ(job.container, "/out/p1.mailing");
    EXPECT_EQ(print(answer.serialize()), text);
}

TEST(JobsChangeReading, TakesWhatAClientWrites) {
    Protocol::JobsChange const written(Protocol::JobAction::Cancel, {"p1", "p2"});
    EXPECT_EQ(print(written.serialize()), R"({"query":"change_jobs","action":"cancel","ids":["p1","p2"]})");
    Protocol::JobsChange const read(written.serialize());
    EXPECT_EQ(read.action, Protocol::JobAction::Cancel);
    EXPECT_EQ(read.ids, written.ids);
    EXPECT_EQ(Protocol::JobsChange(parse(R"({"action":"hold","ids":["p1"]})")).action,
              Protocol::JobAction::Hold);
}

TEST(JobsChangeReading, RefusesWhatIsNoChange) {
    std::pair<char const*, char const*> const cases[] = {
        {R"({"ids":["p1"]})",
         R"("action" of a change of jobs has to be "hold", "release", "cancel" or "upload")"},
        {R"({"action":"stop","ids":["p1"]})",
         R"("action" of a change of jobs has to be "hold", "release", "cancel" or "upload")"},
        {R"({"action":7,"ids":["p1"]})",
         R"("action" of a change of jobs has to be "hold", "release", "cancel" or "upload")"},
        {R"({"action":"hold","ids":"p1"})",
         R"("ids" of a change of jobs has to be an array of at most 1000 texts)"},
        {R"({"action":"hold"})", R"("ids" of a change of jobs has to name one at least)"},
    };
    for (auto const& [change, message] : cases)
        EXPECT_EQ(failureOf([&change = change] { Protocol::JobsChange{parse(change)}; }), message);
}

TEST(JobsChangeAnswers, ReadAsTheyAreWritten) {
    std::string const text = R"({"jobs":[],"refused":[{"id":"p1","why":"it is too late"}]})";
    Protocol::JobsChangeAnswer const answer(parse(text));
    ASSERT_EQ(answer.refused.size(), 1U);
    EXPECT_EQ(answer.refused[0].id, "p1");
    EXPECT_EQ(answer.refused[0].why, "it is too late");
    EXPECT_EQ(print(answer.serialize()), text);
}

} // namespace
