#pragma once
// A step of a schema, in words that all databases are told in.

#include <string>

namespace Database {

enum class Backend { Sqlite, PostgreSql };

/// Statements for all databases, and behind them those for one alone. The former say INTEGER, TEXT and BLOB
/// for types, WITHOUT ROWID behind tables, and "INTEGER NOT NULL PRIMARY KEY" for a number that the database
/// gives.
class Migration {
public:
    Migration(char const* common, char const* sqlite = "", char const* postgres = "")
        : common_(common), sqlite_(sqlite), postgres_(postgres) {}

    std::string scriptFor(Backend backend) const;

private:
    char const* common_;
    char const* sqlite_;
    char const* postgres_;
};

} // namespace Database
