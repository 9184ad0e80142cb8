#pragma once
// All rows of a database, walked table by table: copied into another one, counted and summed up.

#include "programs/database/connection.h"

#include <string>
#include <vector>

namespace Database {

struct Column {
    enum class Type { Number, Text, Bytes };

    std::string name;
    Type type;
    /// From 1, its place in the key of the table; 0 outside of it.
    int keyPlace = 0;
};

struct Table {
    std::string name;
    std::vector<Column> columns;

    std::vector<Column> key() const;
    bool hasBytes() const;
};

/// How many rows a table has, and the SHA-256 of all of them in the order of their keys; the same for the
/// same rows in any database.
struct TableSum {
    long long rows = 0;
    std::string sha256;

    bool operator==(TableSum const&) const = default;
};

/// The tables of an SQLite database, those first that others refer to.
std::vector<Table> tablesOf(Connection& sqlite);

/// Adds all rows of a table to the same one of another database, and sums them up. Rows that others of the
/// table refer to by a text go first: its key is longer. Throws QueryError.
TableSum copyTable(Connection& from, Connection& to, Table const& table);
TableSum sumOf(Connection& connection, Table const& table);

/// Has numbers that the database gives go on behind those that were copied.
void goOnNumbering(Connection& connection, Table const& table);

} // namespace Database
