#include "programs/vlserviced/store/move_database.h"

#include "programs/database/postgres_connection.h"
#include "programs/vlserviced/jobs/backup.h"
#include "programs/vlserviced/store/data_folder.h"
#include "programs/vlserviced/store/letter_store.h"
#include "programs/vlserviced/store/pack_store.h"
#include "programs/vlserviced/store/schema.h"
#include "programs/vlserviced/store/settings_store.h"
#include "tests/support/failure_of.h"
#include "tests/support/postgres_server.h"
#include "tests/support/temporary_folder.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <optional>

namespace {

namespace fs = std::filesystem;

using VlServiced::Job;
using VlServiced::JobState;

/// A record in a data folder, and an empty PostgreSQL database.
class MoveDatabaseTest : public testing::Test {
protected:
    void SetUp() override {
        if (!postgres_.whyNot().empty())
            GTEST_SKIP() << postgres_.whyNot();
        folder_.emplace(data_);
        auto const database = VlServiced::openServiceDatabase(folder_->database());
        VlServiced::openSqlitePackStore(folder_->packs());
        VlServiced::JobStore jobs(*database);
        addJob(jobs);
        VlServiced::LetterStore(*database, jobs).divide("p1", {{1, "fax", true}}, 5);
        VlServiced::SettingsStore(*database).add("ou=b/ou=z/a=x");
    }
    static void addJob(VlServiced::JobStore& jobs) {
        Job job;
        job.pack = {Protocol::OVER_CONNECTION, "packs", "p1"};
        job.title = "Grüße";
        jobs.accept(job);
        jobs.advance("p1", JobState::Accepted, JobState::Queued, 1);
    }
    std::string failure() {
        return failureOf([&] { VlServiced::moveToPostgres(*folder_, postgres_.address()); });
    }

    TemporaryFolder temporary_;
    fs::path data_ = temporary_ / "data";
    VLServiceTest::PostgresDatabase postgres_;
    std::optional<VlServiced::DataFolder> folder_;
};

TEST_F(MoveDatabaseTest, HasAllRowsThereAndLeavesFilesThatNobodyStartsOn) {
    VlServiced::MovedRecord const record = VlServiced::moveToPostgres(*folder_, postgres_.address());
    EXPECT_GE(record.rows, 6);
    auto const shared = VlServiced::openSharedDatabase(postgres_.address());
    EXPECT_FALSE(shared.isNew);
    VlServiced::JobStore jobs(*shared.connection);
    EXPECT_EQ(jobs.find("p1")->title, "Grüße");
    EXPECT_EQ(jobs.find("p1")->state, JobState::Delivering);
    EXPECT_EQ(VlServiced::LetterStore(*shared.connection, jobs).waiting("fax"), 1);
    EXPECT_EQ(VlServiced::SettingsStore(*shared.connection).chain("ou=b/ou=z/a=x").size(), 4U);
    EXPECT_TRUE(fs::exists(data_ / "service.db.moved"));
    EXPECT_TRUE(fs::exists(data_ / "packs.db.moved"));
    EXPECT_FALSE(fs::exists(data_ / "service.db"));
    std::string const moved = "the database of " + data_.string() +
                              " was moved to PostgreSQL: name that one by --database (" +
                              (data_ / "service.db.moved").string() + " is what was moved)";
    EXPECT_EQ(failureOf([&] { VlServiced::requireNotMoved(*folder_); }), moved);
    EXPECT_EQ(failure(), moved);
}

TEST_F(MoveDatabaseTest, HasToComeBeforeAServiceUsesTheOtherDatabase) {
    EXPECT_EQ(
        failureOf([&] { VlServiced::requireMoved(*folder_, postgres_.address()); }),
        "all that this service knows is in " + (data_ / "service.db").string() +
            ": move it by --migrate-to in place of --database, or remove the file where nothing of it is "
            "wanted");
    VlServiced::moveToPostgres(*folder_, postgres_.address());
    EXPECT_EQ(failureOf([&] { VlServiced::requireMoved(*folder_, postgres_.address()); }),
              "nothing was thrown");
    VLServiceTest::PostgresDatabase const other;
    EXPECT_EQ(failureOf([&] { VlServiced::requireMoved(*folder_, other.address()); }),
              "the database " + Database::shownPostgresAddress(other.address()) +
                  " has no tables, and the one of " + data_.string() +
                  " was moved: name the one that it was moved to, or give the files service.db.moved and "
                  "packs.db.moved their former names and move them again");
    VlServiced::DataFolder const fresh(temporary_ / "fresh");
    EXPECT_EQ(failureOf([&] { VlServiced::requireMoved(fresh, other.address()); }), "nothing was thrown");
}

TEST_F(MoveDatabaseTest, IsRefusedWhereTheTargetHoldsAnything) {
    {
        auto const shared = VlServiced::openSharedDatabase(postgres_.address());
        VlServiced::SettingsStore(*shared.connection).add("a=other");
    }
    EXPECT_EQ(failure(), "the database " + Database::shownPostgresAddress(postgres_.address()) +
                             " holds something already: name an empty database");
    EXPECT_TRUE(fs::exists(data_ / "service.db"));
    EXPECT_FALSE(fs::exists(data_ / "service.db.moved"));
    auto const shared = VlServiced::openSharedDatabase(postgres_.address());
    EXPECT_EQ(VlServiced::JobStore(*shared.connection).find("p1"), std::nullopt);
}

TEST_F(MoveDatabaseTest, LeavesNothingThereWhenItFails) {
    // Of a table that the new database has, one row can not be there.
    Database::PostgresConnection(postgres_.address()).run("CREATE VIEW letters AS SELECT 1 AS id");
    EXPECT_NE(failure(), "nothing was thrown");
    EXPECT_EQ(Database::PostgresConnection(postgres_.address())
                  .number("SELECT count(*) FROM pg_tables WHERE schemaname = 'public'"),
              0);
    EXPECT_TRUE(fs::exists(data_ / "service.db"));
}

TEST_F(MoveDatabaseTest, IsRefusedForAFolderWithoutARecord) {
    VlServiced::DataFolder const empty(temporary_ / "empty");
    EXPECT_EQ(failureOf([&] { VlServiced::moveToPostgres(empty, postgres_.address()); }),
              "there is no service database in " + (temporary_ / "empty").string() +
                  ": name the data folder of the service by --data");
}

TEST_F(MoveDatabaseTest, IsABackupAsOfAFileAndBackAgain) {
    VlServiced::moveToPostgres(*folder_, postgres_.address());
    fs::path const file = temporary_ / "backup";
    VlServiced::backUp({data_, data_ / "outbox", postgres_.address()}, file, 1'795'000'000);
    fs::path const restored = temporary_ / "restored";
    EXPECT_EQ(VlServiced::restoreBackup(file, restored, restored / "outbox", VlServiced::Since::Unknown, 1)
                  .doubtfulLetters,
              1);
    auto const database = VlServiced::openServiceDatabase(restored / "service.db");
    EXPECT_EQ(VlServiced::JobStore(*database).find("p1")->title, "Grüße");
    EXPECT_TRUE(fs::exists(restored / "packs.db"));
}

} // namespace
