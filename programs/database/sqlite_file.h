#pragma once
// SQLite files of a known kind: told from others by their application id, brought up to date by migrations.

#include "programs/database/failure.h"

#include <SQLiteCpp/Database.h>

#include <filesystem>

namespace Database {

enum class Journal {
    /// One file that others may read when nobody writes.
    Rollback,
    /// Readers and a writer at once; two more files beside the database while it is open.
    WriteAhead,
};

/// Opens a file for writing, creates it when it is not there and runs the migrations that it lacks. Nobody
/// but its owner may read it. A commit is on the disk when it returns, what is deleted is overwritten, and
/// foreign keys hold. A new file appears with its schema, so that an empty one is what somebody has cut off.
/// ":memory:" is a database in memory. Throws DatabaseError.
SQLite::Database openDatabase(std::filesystem::path const& file, DatabaseKind const& kind, Journal journal);

/// Reads the whole file once to find damage. Throws DatabaseError when there is some.
void requireUndamaged(SQLite::Database& database, DatabaseKind const& kind);

} // namespace Database
