#pragma once
// A connection to an SQLite file.

#include "programs/database/connection.h"
#include "programs/database/sqlite_file.h"

#include <SQLiteCpp/Statement.h>

#include <cstddef>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <vector>

namespace Database {

class SqliteConnection : public Connection {
public:
    explicit SqliteConnection(SQLite::Database database);
    ~SqliteConnection() override;

    Backend backend() const override { return Backend::Sqlite; }
    void run(std::string const& script) override;
    void emptyLog() override { run("PRAGMA wal_checkpoint(TRUNCATE)"); }
    SQLite::Database& file() { return database_; }
    /// What clock_ms() says, in milliseconds.
    void setClock(std::function<long long()> clock) { *clock_ = std::move(clock); }

private:
    struct Statement {
        /// Where a value stands, by its number from 0; 0 when the text does not name it.
        int placeOf(std::size_t value);

        std::unique_ptr<SQLite::Statement> run = {};
        /// Those that were asked for.
        std::vector<int> places = {};
    };
    class StatementRows;

    std::unique_ptr<Rows::Cursor> select(std::string const& sql, Values const& values) override;
    long long execute(std::string const& sql, Values const& values) override;
    void begin(Isolation isolation) override;
    void commit() override;
    void rollback() noexcept override;

    /// A statement with its values, which nobody else has.
    Statement prepared(std::string const& sql, Values const& values);
    void giveBack(std::string const& sql, Statement statement) noexcept;

    SQLite::Database database_;
    std::unique_ptr<std::function<long long()>> clock_;
    /// Those that are not in use, by their texts.
    std::map<std::string, Statement> idle_;
};

} // namespace Database
