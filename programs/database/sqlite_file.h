#pragma once
// SQLite files of a known kind: told from others by their application id, brought up to date by migrations.

#include <SQLiteCpp/Database.h>

#include <filesystem>
#include <stdexcept>
#include <string>
#include <vector>

namespace Database {

/// A failure with a database file as a person reads it: one line with the file and what can be done.
class DatabaseError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

struct DatabaseKind {
    /// As messages name it: "pack database".
    char const* name;
    /// SQLite's application id, which stands in the file's header.
    int applicationId;
    /// Script i leads from schema version i to i + 1; the version that a program knows is their number.
    std::vector<char const*> migrations;
};

enum class Journal {
    /// One file that others may read when nobody writes.
    Rollback,
    /// Readers and a writer at once; two more files beside the database while it is open.
    WriteAhead,
};

/// Opens a file for writing, creates it when it is not there and runs the migrations that it lacks. A commit
/// is on the disk when it returns, and foreign keys hold. Throws DatabaseError.
SQLite::Database openDatabase(std::filesystem::path const& file, DatabaseKind const& kind, Journal journal);

/// Reads the whole file once to find damage. Throws DatabaseError when there is some.
void requireUndamaged(SQLite::Database& database, DatabaseKind const& kind);

/// Opens a file that another program wrote, for reading alone; nothing that its schema defines is run.
/// Values of more than `maxValueBytes` bytes fail to be read. Throws DatabaseError.
SQLite::Database openForReading(std::filesystem::path const& file, DatabaseKind const& kind,
                                int maxValueBytes);

} // namespace Database
