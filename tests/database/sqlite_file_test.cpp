#include "programs/database/sqlite_file.h"

#include "tests/support/temporary_folder.h"

#include <SQLiteCpp/Exception.h>
#include <SQLiteCpp/Statement.h>
#include <SQLiteCpp/Transaction.h>
#include <gtest/gtest.h>

#include <fstream>

namespace {

namespace fs = std::filesystem;

using Database::DatabaseError;
using Database::DatabaseKind;
using Database::Journal;

Database::DatabaseKind const FIRST{"book of words", 0x574F5244, {"CREATE TABLE words (word TEXT)"}};
Database::DatabaseKind const SECOND{
    "book of words",
    0x574F5244,
    {"CREATE TABLE words (word TEXT)", "ALTER TABLE words ADD COLUMN length INTEGER NOT NULL DEFAULT 5"}};
constexpr int ANY_LENGTH = 1 << 20;

class SqliteFile : public testing::Test {
protected:
    SQLite::Database open(Database::DatabaseKind const& kind,
                          Database::Journal journal = Database::Journal::Rollback) {
        return Database::openDatabase(file_, kind, journal);
    }
    std::string failure(Database::DatabaseKind const& kind) {
        try {
            open(kind);
        } catch (Database::DatabaseError const& error) {
            return error.what();
        }
        return "opened";
    }
    std::string readingFailure(Database::DatabaseKind const& kind) {
        try {
            Database::openForReading(file_, kind, ANY_LENGTH);
        } catch (Database::DatabaseError const& error) {
            return error.what();
        }
        return "opened";
    }
    std::string damage() {
        try {
            SQLite::Database database = open(FIRST);
            Database::requireUndamaged(database, FIRST);
        } catch (Database::DatabaseError const& error) {
            return error.what();
        }
        return "none";
    }
    /// Runs SQL on the file behind the back of what opens it.
    void run(char const* sql) {
        SQLite::Database(file_, SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE).exec(sql);
    }

    TemporaryFolder folder_;
    fs::path file_ = folder_ / "words.db";
};

TEST_F(SqliteFile, IsCreatedWithItsSchemaAndItsKind) {
    SQLite::Database database = open(FIRST);
    EXPECT_TRUE(database.tableExists("words"));
    EXPECT_EQ(database.execAndGet("PRAGMA user_version").getInt(), 1);
    EXPECT_EQ(database.execAndGet("PRAGMA application_id").getInt(), 0x574F5244);
}

TEST_F(SqliteFile, CommitsAreOnTheDiskAndForeignKeysHold) {
    for (auto const& [journal, name] :
         {std::pair{Database::Journal::WriteAhead, "wal"}, {Database::Journal::Rollback, "delete"}}) {
        SQLite::Database database = open(FIRST, journal);
        EXPECT_EQ(database.execAndGet("PRAGMA journal_mode").getString(), name);
        EXPECT_EQ(database.execAndGet("PRAGMA synchronous").getInt(), 2) << name;
        EXPECT_EQ(database.execAndGet("PRAGMA foreign_keys").getInt(), 1) << name;
    }
}

TEST_F(SqliteFile, IsBroughtUpToDateAndKeepsItsContent) {
    open(FIRST).exec("INSERT INTO words VALUES ('hello')");
    SQLite::Database database = open(SECOND);
    EXPECT_EQ(database.execAndGet("SELECT word || length FROM words").getString(), "hello5");
    EXPECT_EQ(database.execAndGet("PRAGMA user_version").getInt(), 2);
}

TEST_F(SqliteFile, LeavesNothingOfAMigrationThatFails) {
    Database::DatabaseKind const broken{
        "book of words", 0x574F5244, {"CREATE TABLE words (word TEXT)", "CREATE TABLE x (y); nonsense"}};
    open(FIRST);
    EXPECT_NE(failure(broken), "opened");
    SQLite::Database database = open(FIRST);
    EXPECT_FALSE(database.tableExists("x"));
    EXPECT_EQ(database.execAndGet("PRAGMA user_version").getInt(), 1);
}

TEST_F(SqliteFile, OfANewerVersionIsRefusedAndLeftAsItIs) {
    open(SECOND);
    EXPECT_EQ(failure(FIRST), "the book of words " + file_.string() +
                                  " was written by a newer version of this program (schema 2, known is 1): "
                                  "use that version");
    EXPECT_EQ(readingFailure(FIRST), failure(FIRST));
    EXPECT_EQ(open(SECOND).execAndGet("PRAGMA user_version").getInt(), 2);
}

TEST_F(SqliteFile, OfAnotherKindIsRefused) {
    run("CREATE TABLE recipes (name TEXT)");
    EXPECT_EQ(failure(FIRST), file_.string() + " is not a book of words");
    EXPECT_EQ(readingFailure(FIRST), file_.string() + " is not a book of words");
}

TEST_F(SqliteFile, ThatIsNoDatabaseIsRefused) {
    std::ofstream(file_) << std::string(4096, 'x');
    EXPECT_EQ(failure(FIRST), file_.string() + " is not a book of words");
    EXPECT_EQ(readingFailure(FIRST), file_.string() + " is not a book of words");
}

TEST_F(SqliteFile, ThatIsWholeIsFoundUndamaged) { EXPECT_EQ(damage(), "none"); }

TEST_F(SqliteFile, ThatIsDamagedIsFoundOut) {
    {
        SQLite::Database database = open(FIRST);
        SQLite::Transaction transaction(database);
        for (int i = 0; i < 2000; ++i)
            database.exec("INSERT INTO words VALUES ('a word of some length " + std::to_string(i) + "')");
        transaction.commit();
    }
    std::fstream(file_).seekp(2 * 4096) << std::string(4096, '\xFF');
    std::string const text = damage();
    EXPECT_TRUE(text.starts_with("the book of words " + file_.string() + " is damaged (")) << text;
    EXPECT_TRUE(text.ends_with("): restore it from a backup, or move it away to begin anew")) << text;
}

TEST_F(SqliteFile, InAFolderThatIsMissingIsRefused) {
    file_ = folder_.path() / "missing" / "words.db";
    EXPECT_EQ(failure(FIRST),
              "cannot open the book of words " + file_.string() + ": unable to open database file");
    EXPECT_EQ(readingFailure(FIRST), "there is no book of words " + file_.string());
}

TEST_F(SqliteFile, IsOnlyReadWhenItIsOpenedForReading) {
    open(FIRST).exec("INSERT INTO words VALUES ('hello')");
    SQLite::Database database = Database::openForReading(file_, FIRST, ANY_LENGTH);
    EXPECT_EQ(database.execAndGet("SELECT word FROM words").getString(), "hello");
    EXPECT_THROW(database.exec("DELETE FROM words"), SQLite::Exception);
}

TEST_F(SqliteFile, WithValuesBeyondTheLimitFailsToBeRead) {
    open(FIRST).exec("INSERT INTO words VALUES (zeroblob(5000))");
    SQLite::Database database = Database::openForReading(file_, FIRST, 4000);
    EXPECT_THROW(database.execAndGet("SELECT word FROM words").getString(), SQLite::Exception);
}

TEST_F(SqliteFile, WithAViewInPlaceOfATableIsNotRead) {
    open(FIRST);
    run("DROP TABLE words; CREATE VIEW words AS SELECT 'hello' AS word");
    EXPECT_EQ(readingFailure(FIRST), file_.string() + " is not a book of words");
}

TEST_F(SqliteFile, IsNoFolderAndNoPipe) {
    fs::create_directory(file_);
    EXPECT_EQ(readingFailure(FIRST), "there is no book of words " + file_.string());
}

} // namespace
