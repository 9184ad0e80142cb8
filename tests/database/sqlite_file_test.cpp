#include "programs/database/sqlite_file.h"

#include "programs/database/foreign_file.h"
#include "tests/support/temporary_folder.h"

#include <SQLiteCpp/Exception.h>
#include <SQLiteCpp/Statement.h>
#include <SQLiteCpp/Transaction.h>
#include <gtest/gtest.h>

#include <chrono>
#include <fstream>
#include <memory>
#include <sys/stat.h>
#include <unistd.h>

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
            Database::ForeignFile const opened(file_, kind, ANY_LENGTH, std::chrono::seconds(60));
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

TEST_F(SqliteFile, IsForItsOwnerAlone) {
    open(FIRST);
    EXPECT_EQ(fs::status(file_).permissions(), fs::perms(0600));
    fs::permissions(file_, fs::perms(0644));
    open(FIRST);
    EXPECT_EQ(fs::status(file_).permissions(), fs::perms(0600));
}

TEST_F(SqliteFile, ThatIsEmptyIsNotTakenForANewOne) {
    std::ofstream(file_).close();
    EXPECT_EQ(failure(FIRST),
              "the book of words " + file_.string() +
                  " is damaged (it is empty): restore it from a backup, or move it away to begin "
                  "anew");
    EXPECT_EQ(fs::file_size(file_), 0u);
}

TEST_F(SqliteFile, LeavesNothingBesideItWhenItIsMade) {
    open(FIRST);
    EXPECT_EQ(std::distance(fs::directory_iterator(folder_.path()), {}), 1);
}

TEST_F(SqliteFile, OverwritesWhatIsDeleted) {
    open(FIRST).exec("INSERT INTO words VALUES ('a secret word')");
    open(FIRST).exec("DELETE FROM words");
    std::ifstream in(file_, std::ios::binary);
    std::string const bytes{std::istreambuf_iterator<char>(in), {}};
    EXPECT_EQ(bytes.find("a secret word"), std::string::npos);
}

/// What others have written, opened with little trust.
class ForeignFileTest : public SqliteFile {
protected:
    ForeignFileTest() { open(FIRST).exec("INSERT INTO words VALUES ('hello')"); }

    /// A new file with this schema, of the right kind by its numbers.
    void forge(std::string const& schema) {
        fs::remove(file_);
        run((schema + "; PRAGMA application_id = 0x574F5244; PRAGMA user_version = 1").c_str());
    }

    static constexpr std::chrono::seconds LONG{60};
};

TEST_F(ForeignFileTest, IsOnlyRead) {
    auto const file = std::make_unique<Database::ForeignFile>(file_, FIRST, ANY_LENGTH, LONG);
    EXPECT_EQ(file->begin().execAndGet("SELECT word FROM words").getString(), "hello");
    EXPECT_THROW(file->begin().exec("DELETE FROM words"), SQLite::Exception);
    EXPECT_THROW(run("DELETE FROM words"), SQLite::Exception) << "it changes while it is being read";
}

TEST_F(ForeignFileTest, WithValuesBeyondTheLimitFailsToBeRead) {
    open(FIRST).exec("UPDATE words SET word = zeroblob(5000)");
    auto const file = std::make_unique<Database::ForeignFile>(file_, FIRST, 4000, LONG);
    EXPECT_THROW(file->begin().execAndGet("SELECT word FROM words").getString(), SQLite::Exception);
}

TEST_F(ForeignFileTest, WithAnotherSchemaThanTheKindsIsNotRead) {
    for (char const* schema :
         {"CREATE VIEW words AS SELECT 'hello' AS word", "CREATE TABLE words (word TEXT, more TEXT)",
          "CREATE TABLE words (x, word TEXT AS (hex(zeroblob(100000000))))",
          "CREATE TABLE words (word TEXT CHECK (length(word) < 5))", "CREATE TABLE words(word TEXT)",
          "CREATE TABLE words (word TEXT); CREATE INDEX by_hex ON words (hex(word))",
          "CREATE TABLE words (word TEXT); CREATE TABLE more (x)",
          "CREATE TABLE words (word TEXT); CREATE TRIGGER t AFTER INSERT ON words BEGIN DELETE FROM words; "
          "END",
          "CREATE VIRTUAL TABLE words USING fts5(word)"}) {
        forge(schema);
        EXPECT_EQ(readingFailure(FIRST), file_.string() + " is not a book of words") << schema;
    }
}

TEST_F(ForeignFileTest, StopsWhatTakesTooLong) {
    auto const file =
        std::make_unique<Database::ForeignFile>(file_, FIRST, ANY_LENGTH, std::chrono::milliseconds(50));
    EXPECT_THROW(file->begin().execAndGet("WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n) "
                                          "SELECT count(*) FROM n, words"),
                 SQLite::Exception);
    EXPECT_EQ(file->begin().execAndGet("SELECT word FROM words").getString(), "hello");
}

TEST_F(ForeignFileTest, PlaysNoJournalBack) {
    fs::path const journal = file_.string() + "-journal";
    std::ofstream(journal) << std::string(1024, 'j');
    EXPECT_EQ(readingFailure(FIRST),
              "the book of words " + file_.string() +
                  " was left in the middle of a change: let the program that wrote it open it once more");
    EXPECT_EQ(fs::file_size(journal), 1024u);
}

TEST_F(ForeignFileTest, IsReadWhileSomebodyPreparesAChange) {
    SQLite::Database writer = open(FIRST);
    SQLite::Transaction transaction(writer, SQLite::TransactionBehavior::IMMEDIATE);
    writer.exec("INSERT INTO words VALUES ('more')");
    auto const file = std::make_unique<Database::ForeignFile>(file_, FIRST, ANY_LENGTH, LONG);
    EXPECT_EQ(file->begin().execAndGet("SELECT count(*) FROM words").getInt(), 1);
}

TEST_F(ForeignFileTest, ThatOthersMayWriteIsNotRead) {
    fs::permissions(file_, fs::perms(0620));
    EXPECT_EQ(readingFailure(FIRST), "the book of words " + file_.string() +
                                         " is not read, because others may write " + file_.string() +
                                         ": take their right away (chmod go-w)");
    fs::permissions(file_, fs::perms(0600));
    fs::permissions(folder_.path(), fs::perms(0777));
    EXPECT_EQ(readingFailure(FIRST), "the book of words " + file_.string() +
                                         " is not read, because others may write " + folder_.path().string() +
                                         ": take their right away (chmod go-w)");
}

TEST_F(ForeignFileTest, OfAnotherUserIsNotRead) {
    if (::geteuid() != 0)
        GTEST_SKIP() << "only root can give a file to another user";
    ASSERT_EQ(::chown(file_.c_str(), 12345, 12345), 0);
    EXPECT_EQ(readingFailure(FIRST), "the book of words " + file_.string() + " is not read, because " +
                                         file_.string() + " belongs to another user");
}

TEST_F(ForeignFileTest, IsNoFolderNoPipeAndNoLink) {
    std::string const message = "there is no book of words " + file_.string();
    fs::rename(file_, folder_ / "real.db");
    EXPECT_EQ(readingFailure(FIRST), message);
    fs::create_symlink(folder_ / "real.db", file_);
    EXPECT_EQ(readingFailure(FIRST), message);
    fs::remove(file_);
    fs::create_directory(file_);
    EXPECT_EQ(readingFailure(FIRST), message);
    fs::remove(file_);
    ASSERT_EQ(::mkfifo(file_.c_str(), 0600), 0);
    EXPECT_EQ(readingFailure(FIRST), message);
}

TEST_F(ForeignFileTest, HasAnyName) {
    fs::path const odd = folder_ / "a b?mode=rw#50%.db";
    fs::rename(file_, odd);
    file_ = odd;
    auto const file = std::make_unique<Database::ForeignFile>(file_, FIRST, ANY_LENGTH, LONG);
    EXPECT_EQ(file->begin().execAndGet("SELECT word FROM words").getString(), "hello");
}

} // namespace
