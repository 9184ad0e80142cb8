#include "programs/vlserviced/jobs/held_queries.h"

#include "programs/vlserviced/store/schema.h"
#include "tests/support/temporary_folder.h"

#include <boost/asio/io_context.hpp>
#include <gtest/gtest.h>

namespace {

using VlServiced::HeldQueries;
using VlServiced::Job;
using VlServiced::JobState;

class HeldQueriesTest : public testing::Test {
protected:
    HeldQueriesTest() {
        jobs_.onChange([this](std::string const& packId) { held_.onChange(packId); });
        for (char const* id : {"p1", "p2"}) {
            Job job;
            job.pack = {"/srv/packs", "packs.db", id};
            jobs_.accept(job);
        }
    }
    void ask(std::vector<std::string> const& ids, long long wait) {
        Protocol::JobsQuery query;
        query.ids = ids;
        query.wait = wait;
        held_.hold(query, [this] { ++answers_; });
    }
    void fetch(char const* packId) { jobs_.advance(packId, JobState::Accepted, JobState::Queued, 1); }

    static constexpr long long LONG = 20'000;

    TemporaryFolder folder_;
    std::unique_ptr<Database::Connection> database_ = VlServiced::openServiceDatabase(folder_ / "service.db");
    VlServiced::JobStore jobs_{*database_};
    boost::asio::io_context io_;
    HeldQueries held_{io_, jobs_};
    int answers_ = 0;
};

TEST_F(HeldQueriesTest, AnswerAtOnceWhatDoesNotWait) {
    ask({"p1"}, 0);
    EXPECT_EQ(answers_, 1);
    ask({}, LONG);
    EXPECT_EQ(answers_, 2);
    ask({"unknown"}, LONG);
    EXPECT_EQ(answers_, 3);
    fetch("p1");
    ask({"p1"}, LONG);
    EXPECT_EQ(answers_, 4);
}

TEST_F(HeldQueriesTest, AnswerWhenTheLastOfItsJobsIsFetched) {
    ask({"p1", "p2", "p1"}, LONG);
    ask({"p2"}, LONG);
    EXPECT_EQ(answers_, 0);
    fetch("p1");
    EXPECT_EQ(answers_, 0);
    fetch("p2");
    EXPECT_EQ(answers_, 2);
    jobs_.fail("p2", "later", 3);
    EXPECT_EQ(answers_, 2);
}

TEST_F(HeldQueriesTest, AnswerWhenAProblemIsInTheWay) {
    ask({"p1"}, LONG);
    jobs_.setProblem("p1", "");
    EXPECT_EQ(answers_, 0);
    jobs_.setProblem("p1", "the disk is full");
    EXPECT_EQ(answers_, 1);
}

TEST_F(HeldQueriesTest, AnswerWhenTheTimeIsUp) {
    ask({"p1", "p2"}, 1);
    EXPECT_EQ(answers_, 0);
    io_.run();
    EXPECT_EQ(answers_, 1);
    fetch("p1");
    fetch("p2");
    EXPECT_EQ(answers_, 1);
}

TEST_F(HeldQueriesTest, AreAllAnsweredAtTheEnd) {
    ask({"p1"}, LONG);
    ask({"p2"}, LONG);
    held_.releaseAll();
    EXPECT_EQ(answers_, 2);
    EXPECT_NE(io_.run(), 0u) << "the timers have gone";
}

TEST_F(HeldQueriesTest, MayBeAskedAgainFromWithinAnAnswer) {
    Protocol::JobsQuery query;
    query.ids = {"p1"};
    query.wait = LONG;
    held_.hold(query, [this] { ask({"p2"}, LONG); });
    fetch("p1");
    EXPECT_EQ(answers_, 0);
    fetch("p2");
    EXPECT_EQ(answers_, 1);
}

} // namespace
