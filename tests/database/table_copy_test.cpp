#include "programs/database/table_copy.h"

#include "programs/database/postgres_connection.h"
#include "programs/database/sqlite_connection.h"
#include "tests/support/postgres_server.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <optional>

namespace {

using Database::Backend;
using Database::Bytes;
using Database::Connection;
using Database::Rows;
using Database::Table;
using Database::TableSum;

constexpr char const* SCHEMA =
    "CREATE TABLE nodes (id TEXT NOT NULL PRIMARY KEY, parent TEXT REFERENCES nodes (id)) WITHOUT ROWID;"
    "CREATE TABLE things (number INTEGER NOT NULL PRIMARY KEY, node TEXT REFERENCES nodes (id), size "
    "INTEGER);"
    "CREATE TABLE pieces (thing INTEGER NOT NULL REFERENCES things (number), place TEXT NOT NULL, data BLOB, "
    "PRIMARY KEY (thing, place));";

std::string copyTargetName(testing::TestParamInfo<Backend> const& info) {
    return info.param == Backend::Sqlite ? "IntoSqlite" : "IntoPostgreSql";
}

/// Tables of an SQLite database, copied into another database.
class TableCopyTest : public testing::TestWithParam<Backend> {
protected:
    void SetUp() override {
        from_ = empty();
        if (GetParam() == Backend::PostgreSql) {
            postgres_.emplace();
            if (!postgres_->whyNot().empty())
                GTEST_SKIP() << postgres_->whyNot();
            to_ = std::make_unique<Database::PostgresConnection>(postgres_->address());
        } else {
            to_ = empty();
        }
        for (Connection* const each : {from_.get(), to_.get()})
            each->run(Database::Migration(SCHEMA).scriptFor(each->backend()));
        fill();
    }
    static std::unique_ptr<Connection> empty() {
        auto connection = std::make_unique<Database::SqliteConnection>(
            SQLite::Database(":memory:", SQLite::OPEN_READWRITE));
        connection->run("PRAGMA foreign_keys = ON");
        return connection;
    }
    void fill() {
        // What is above a node stands behind it by the alphabet.
        from_->change("INSERT INTO nodes VALUES ('', NULL), ('a=x', ''), ('ou=z/a=x', 'a=x'), "
                      "('ou=b/ou=z/a=x', 'ou=z/a=x')");
        from_->change("INSERT INTO things VALUES (7, 'a=x', NULL), (9, NULL, -5), (10000000000, '', 0)");
        from_->change("INSERT INTO pieces VALUES (7, 'grüße', $1), (7, 'b', NULL), (9, '', $2)",
                      Bytes{std::string_view("\0\xFF\n", 3)}, Bytes{std::string_view()});
    }
    std::vector<TableSum> copyAll() {
        std::vector<TableSum> sums;
        for (Table const& table : Database::tablesOf(*from_)) {
            sums.push_back(Database::copyTable(*from_, *to_, table));
            EXPECT_EQ(Database::sumOf(*to_, table), sums.back()) << table.name;
            EXPECT_EQ(Database::sumOf(*from_, table), sums.back()) << table.name;
            Database::goOnNumbering(*to_, table);
        }
        return sums;
    }

    std::optional<VLServiceTest::PostgresDatabase> postgres_;
    std::unique_ptr<Connection> from_;
    std::unique_ptr<Connection> to_;
};

TEST_P(TableCopyTest, HasTablesInTheOrderInWhichTheyReferToEachOther) {
    std::vector<Table> const tables = Database::tablesOf(*from_);
    ASSERT_EQ(tables.size(), 3U);
    EXPECT_EQ(tables[0].name, "nodes");
    EXPECT_EQ(tables[1].name, "things");
    EXPECT_EQ(tables[2].name, "pieces");
    EXPECT_FALSE(tables[1].hasBytes());
    EXPECT_TRUE(tables[2].hasBytes());
    EXPECT_EQ(tables[2].key().at(1).name, "place");
}

TEST_P(TableCopyTest, HasTheSameRows) {
    std::vector<TableSum> const sums = copyAll();
    EXPECT_EQ(sums.at(0).rows, 4);
    EXPECT_EQ(sums.at(1).rows, 3);
    EXPECT_EQ(sums.at(2).rows, 3);
    Rows rows = to_->query("SELECT place, data FROM pieces WHERE thing = 7 ORDER BY place");
    ASSERT_TRUE(rows.next());
    EXPECT_EQ(rows.text(0), "b");
    EXPECT_TRUE(rows.isNull(1));
    ASSERT_TRUE(rows.next());
    EXPECT_EQ(rows.text(0), "grüße");
    EXPECT_EQ(rows.text(1), std::string("\0\xFF\n", 3));
    EXPECT_EQ(to_->number("SELECT size FROM things WHERE number = 9"), -5);
    EXPECT_EQ(to_->number("SELECT count(*) FROM things WHERE node IS NULL AND number = 9"), 1);
}

TEST_P(TableCopyTest, HasAnotherSumForAnyOtherRow) {
    Table const things = Database::tablesOf(*from_).at(1);
    TableSum const before = copyAll().at(1);
    for (char const* const change :
         {"UPDATE things SET size = 5 WHERE number = 9", "UPDATE things SET size = 0 WHERE number = 7",
          "UPDATE things SET node = '' WHERE number = 9", "INSERT INTO things VALUES (1, '', 1)"}) {
        Database::Transaction transaction(*to_);
        to_->change(change);
        EXPECT_NE(Database::sumOf(*to_, things).sha256, before.sha256) << change;
    }
}

TEST_P(TableCopyTest, GoesOnWithItsNumbersBehindThoseThatWereCopied) {
    copyAll();
    to_->change("INSERT INTO things (size) VALUES (1)");
    EXPECT_EQ(to_->number("SELECT max(number) FROM things"), 10'000'000'001);
}

INSTANTIATE_TEST_SUITE_P(Copies, TableCopyTest, testing::Values(Backend::Sqlite, Backend::PostgreSql),
                         copyTargetName);

} // namespace
