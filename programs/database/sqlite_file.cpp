#include "programs/database/sqlite_file.h"

#include <SQLiteCpp/Exception.h>
#include <SQLiteCpp/Statement.h>
#include <SQLiteCpp/Transaction.h>
#include <sqlite3.h>

#include <cstdint>

namespace Database {
namespace {

namespace fs = std::filesystem;

/// Another process may hold the file for a moment.
constexpr int BUSY_TIMEOUT_MS = 5000;
constexpr int READING_BUSY_TIMEOUT_MS = 500;

std::string theFile(DatabaseKind const& kind, fs::path const& file) {
    return "the " + std::string(kind.name) + " " + file.string();
}

[[noreturn]] void failDamaged(DatabaseKind const& kind, fs::path const& file, std::string const& how) {
    throw DatabaseError(theFile(kind, file) + " is damaged (" + how +
                        "): restore it from a backup, or move it away to begin anew");
}

[[noreturn]] void failOther(DatabaseKind const& kind, fs::path const& file) {
    throw DatabaseError(file.string() + " is not a " + kind.name);
}

[[noreturn]] void rethrow(SQLite::Exception const& failure, DatabaseKind const& kind, fs::path const& file) {
    switch (failure.getErrorCode()) {
    case SQLITE_NOTADB:
        failOther(kind, file);
    case SQLITE_CORRUPT:
        failDamaged(kind, file, failure.what());
    case SQLITE_READONLY:
        throw DatabaseError(theFile(kind, file) + " cannot be written: check the rights of the file");
    default:
        throw DatabaseError("cannot open " + theFile(kind, file) + ": " + failure.what());
    }
}

int number(SQLite::Database& database, char const* query) { return database.execAndGet(query).getInt(); }

/// Tells what the file is before anything is changed in it.
void checkKind(SQLite::Database& database, DatabaseKind const& kind, fs::path const& file) {
    int const applicationId = number(database, "PRAGMA application_id");
    int const version = number(database, "PRAGMA user_version");
    bool const isNew = number(database, "SELECT count(*) FROM sqlite_schema") == 0 && version == 0;
    if (applicationId != kind.applicationId && !(isNew && applicationId == 0))
        failOther(kind, file);
    auto const known = static_cast<int>(kind.migrations.size());
    if (version > known)
        throw DatabaseError(theFile(kind, file) + " was written by a newer version of this program (schema " +
                            std::to_string(version) + ", known is " + std::to_string(known) +
                            "): use that version");
    if (version < 0)
        failDamaged(kind, file, "schema " + std::to_string(version));
}

void migrate(SQLite::Database& database, DatabaseKind const& kind) {
    for (auto version = static_cast<std::size_t>(number(database, "PRAGMA user_version"));
         version < kind.migrations.size(); ++version) {
        SQLite::Transaction transaction(database, SQLite::TransactionBehavior::IMMEDIATE);
        // Another process may have been faster.
        if (number(database, "PRAGMA user_version") == static_cast<int>(version)) {
            database.exec(kind.migrations[version]);
            database.exec("PRAGMA application_id = " + std::to_string(kind.applicationId));
            database.exec("PRAGMA user_version = " + std::to_string(version + 1));
        }
        transaction.commit();
    }
}

} // namespace

SQLite::Database openDatabase(fs::path const& file, DatabaseKind const& kind, Journal journal) {
    try {
        SQLite::Database database(file, SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE, BUSY_TIMEOUT_MS);
        database.exec("PRAGMA trusted_schema = OFF");
        checkKind(database, kind, file);
        database.exec(journal == Journal::WriteAhead ? "PRAGMA journal_mode = WAL"
                                                     : "PRAGMA journal_mode = DELETE");
        // In write-ahead mode the weaker levels would lose the last commits with the power.
        database.exec("PRAGMA synchronous = FULL");
        database.exec("PRAGMA foreign_keys = ON");
        migrate(database, kind);
        return database;
    } catch (SQLite::Exception const& failure) {
        rethrow(failure, kind, file);
    }
}

void requireUndamaged(SQLite::Database& database, DatabaseKind const& kind) {
    fs::path const file = database.getFilename();
    try {
        std::string const verdict = database.execAndGet("PRAGMA quick_check(1)").getString();
        if (verdict != "ok")
            failDamaged(kind, file, verdict);
    } catch (SQLite::Exception const& failure) {
        rethrow(failure, kind, file);
    }
}

SQLite::Database openForReading(fs::path const& file, DatabaseKind const& kind, int maxValueBytes) {
    // A pipe would hold up the opening, and a folder would fail with a misleading text.
    std::error_code error;
    if (!fs::is_regular_file(file, error))
        throw DatabaseError("there is no " + std::string(kind.name) + " " + file.string());
    try {
        SQLite::Database database(file, SQLite::OPEN_READONLY, READING_BUSY_TIMEOUT_MS);
        sqlite3_limit(database.getHandle(), SQLITE_LIMIT_LENGTH, maxValueBytes);
        database.exec("PRAGMA trusted_schema = OFF");
        database.exec("PRAGMA cell_size_check = ON");
        checkKind(database, kind, file);
        if (number(database, "PRAGMA user_version") < static_cast<int>(kind.migrations.size()))
            failOther(kind, file);
        // A view or a virtual table under a table's name would run what its author wrote.
        if (number(database, "SELECT count(*) FROM sqlite_schema WHERE type = 'view' OR type = 'trigger' OR "
                             "(type = 'table' AND sql LIKE 'CREATE VIRTUAL%')") != 0)
            failOther(kind, file);
        return database;
    } catch (SQLite::Exception const& failure) {
        rethrow(failure, kind, file);
    }
}

} // namespace Database
