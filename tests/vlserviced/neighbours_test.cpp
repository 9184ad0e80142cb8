// What services on one database hear of each other, without a look for themselves.
#include "programs/vlserviced/neighbours.h"

#include "programs/vlserviced/store/job_store.h"
#include "programs/vlserviced/store/letter_store.h"
#include "programs/vlserviced/store/schema.h"
#include "programs/vlserviced/store/settings_store.h"
#include "tests/support/postgres_server.h"

#include <boost/asio/io_context.hpp>
#include <gmock/gmock.h>

#include <chrono>

namespace {

using VlServiced::JobState;

class NeighboursTest : public testing::Test {
protected:
    void SetUp() override {
        if (!postgres_.whyNot().empty())
            GTEST_SKIP() << postgres_.whyNot();
        database_ = VlServiced::openSharedDatabase(postgres_.address()).connection;
        jobs_.emplace(*database_, VlServiced::Holder{"other", 60});
        neighbours_.emplace(io_, postgres_.address(),
                            VlServiced::Neighbours::Heard{
                                [this](std::string const& packId) { heard_.push_back("job " + packId); },
                                [this] { heard_.emplace_back("work"); },
                                [this] { heard_.emplace_back("letters"); },
                                [this] { heard_.emplace_back("settings"); }});
        neighbours_->listen();
        heard_.clear();
    }

    /// What is heard of a change up to that; a minute is never needed.
    template<typename Change>
    bool hears(std::string const& wanted, Change change) {
        heard_.clear();
        change();
        auto const end = std::chrono::steady_clock::now() + std::chrono::minutes(1);
        while (!testing::Value(heard_, testing::Contains(wanted)) && std::chrono::steady_clock::now() < end) {
            io_.restart();
            io_.run_one_until(end);
        }
        return testing::Value(heard_, testing::Contains(wanted));
    }
    void acceptHeld() {
        VlServiced::Job job;
        job.pack = {"channel", "packs", "p1"};
        job.acceptedAt = 1000;
        job.due = 2000;
        job.toUpload = true;
        jobs_->accept(job);
        jobs_->claim("p1");
        jobs_->advance("p1", JobState::Accepted, JobState::Held, 1000);
        jobs_->letGo("p1", 0);
    }

    VLServiceTest::PostgresDatabase postgres_;
    std::unique_ptr<Database::Connection> database_;
    std::optional<VlServiced::JobStore> jobs_;
    boost::asio::io_context io_;
    std::optional<VlServiced::Neighbours> neighbours_;
    std::vector<std::string> heard_;
};

TEST_F(NeighboursTest, AreWokenWhenSomethingFallsDueToThem) {
    acceptHeld();
    EXPECT_EQ(jobs_->due(2000, 10).size(), 1u);
    EXPECT_TRUE(hears("work", [&] { jobs_->advance("p1", JobState::Held, JobState::Queued, 2000); }));
}

TEST_F(NeighboursTest, AreToldOfEachJobThatChanges) {
    EXPECT_TRUE(hears("job p1", [&] { acceptHeld(); }));
    EXPECT_TRUE(hears("job p1", [&] { jobs_->cancel("p1", 1500); }));
}

TEST_F(NeighboursTest, AreToldOfLettersForCarriersThatTheyMayHave) {
    acceptHeld();
    jobs_->advance("p1", JobState::Held, JobState::Queued, 2000);
    VlServiced::LetterStore letters(*database_, *jobs_);
    EXPECT_TRUE(hears("letters", [&] { letters.divide("p1", {{1, "postal", true}}, 2000); }));
}

TEST_F(NeighboursTest, AreToldOfSettings) {
    EXPECT_TRUE(hears("settings", [&] { VlServiced::SettingsStore(*database_).add("a=acme"); }));
}

TEST_F(NeighboursTest, TakeAllForChangedWhenTheyListenAnew) {
    neighbours_->stop();
    EXPECT_TRUE(hears("work", [&] { neighbours_->listen(); }));
    EXPECT_THAT(heard_, testing::UnorderedElementsAre("settings", "work", "letters"));
}

} // namespace
