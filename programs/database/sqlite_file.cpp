#include "programs/database/sqlite_file.h"

#include <SQLiteCpp/Exception.h>
#include <SQLiteCpp/Statement.h>
#include <SQLiteCpp/Transaction.h>
#include <sqlite3.h>

#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace Database {
namespace {

namespace fs = std::filesystem;

/// Another process may hold the file while it writes or reads a large mailing.
constexpr int BUSY_TIMEOUT_MS = 60'000;
constexpr char const* IN_MEMORY = ":memory:";

[[noreturn]] void failDamaged(DatabaseKind const& kind, fs::path const& file, std::string const& how) {
    throw DatabaseError(Base::Code::DatabaseDamaged,
                        theFile(kind, file) + " is damaged (" + how +
                            "): restore it from a backup, or move it away to begin anew");
}

int number(SQLite::Database& database, char const* query) { return database.execAndGet(query).getInt(); }

void migrate(SQLite::Database& database, DatabaseKind const& kind) {
    for (auto version = static_cast<std::size_t>(number(database, "PRAGMA user_version"));
         version < kind.migrations.size(); ++version) {
        SQLite::Transaction transaction(database, SQLite::TransactionBehavior::IMMEDIATE);
        // Another process may have been faster.
        if (number(database, "PRAGMA user_version") == static_cast<int>(version)) {
            database.exec(kind.migrations[version].scriptFor(Backend::Sqlite));
            database.exec("PRAGMA application_id = " + std::to_string(kind.applicationId));
            database.exec("PRAGMA user_version = " + std::to_string(version + 1));
        }
        transaction.commit();
    }
}

/// Files from before, or from elsewhere, may be open to others.
void keepToOwner(fs::path const& file) {
    struct stat status {};
    if (::stat(file.c_str(), &status) == 0 && status.st_uid == ::geteuid() && (status.st_mode & 077) != 0)
        ::chmod(file.c_str(), 0600);
}

SQLite::Database openAndMigrate(fs::path const& file, DatabaseKind const& kind, Journal journal) {
    SQLite::Database database(file, SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE, BUSY_TIMEOUT_MS);
    database.exec("PRAGMA trusted_schema = OFF");
    database.exec(kind.beginning);
    requireKind(database, kind, file);
    keepToOwner(file);
    database.exec(journal == Journal::WriteAhead ? "PRAGMA journal_mode = WAL"
                                                 : "PRAGMA journal_mode = DELETE");
    // In write-ahead mode the weaker levels would lose the last commits with the power.
    database.exec("PRAGMA synchronous = FULL");
    database.exec("PRAGMA foreign_keys = ON");
    database.exec("PRAGMA secure_delete = ON");
    migrate(database, kind);
    return database;
}

/// Gives a file its name unless there is one of that name. Some file systems know no links, others no such
/// renaming.
bool giveName(char const* temporary, char const* name) {
    return ::link(temporary, name) == 0 || errno == EEXIST ||
           ::renameat2(AT_FDCWD, temporary, AT_FDCWD, name, RENAME_NOREPLACE) == 0 || errno == EEXIST;
}

/// Makes a file with its schema under another name, and then gives it its own, unless somebody was faster.
void create(fs::path const& file, DatabaseKind const& kind) {
    std::string temporary = file.string() + ".XXXXXX.part";
    int const reserved = ::mkstemps(temporary.data(), 5);
    if (reserved < 0)
        throw DatabaseError(Base::Code::DatabaseUnavailable,
                            "cannot open " + theFile(kind, file) + ": unable to open database file");
    ::close(reserved);
    auto const remove = [&] { ::unlink(temporary.c_str()); };
    try {
        openAndMigrate(temporary, kind, Journal::Rollback);
    } catch (...) {
        remove();
        throw;
    }
    if (!giveName(temporary.c_str(), file.c_str())) {
        int const error = errno;
        remove();
        throw DatabaseError(Base::Code::DatabaseUnavailable,
                            "cannot open " + theFile(kind, file) + ": " + std::strerror(error));
    }
    remove();
}

} // namespace

std::string theFile(DatabaseKind const& kind, fs::path const& file) {
    return "the " + std::string(kind.name) + " " + file.string();
}

void failOther(DatabaseKind const& kind, fs::path const& file) {
    throw DatabaseError(Base::Code::DatabaseUnusable, file.string() + " is not a " + kind.name);
}

void rethrow(SQLite::Exception const& failure, DatabaseKind const& kind, fs::path const& file) {
    switch (failure.getErrorCode()) {
    case SQLITE_NOTADB:
        failOther(kind, file);
    case SQLITE_CORRUPT:
        failDamaged(kind, file, failure.what());
    case SQLITE_READONLY:
        throw DatabaseError(Base::Code::DatabaseUnusable,
                            theFile(kind, file) + " cannot be written: check the rights of the file");
    default:
        throw DatabaseError(Base::Code::DatabaseUnavailable,
                            "cannot open " + theFile(kind, file) + ": " + failure.what());
    }
}

void requireKnownVersion(DatabaseKind const& kind, std::string const& database, long long version) {
    auto const known = static_cast<long long>(kind.migrations.size());
    if (version > known)
        throw DatabaseError(Base::Code::DatabaseNewer,
                            database + " was written by a newer version of this program (schema " +
                                std::to_string(version) + ", known is " + std::to_string(known) +
                                "): use that version");
}

void requireKind(SQLite::Database& database, DatabaseKind const& kind, fs::path const& file) {
    int const applicationId = number(database, "PRAGMA application_id");
    int const version = number(database, "PRAGMA user_version");
    bool const isNew = number(database, "SELECT count(*) FROM sqlite_schema") == 0 && version == 0;
    if (applicationId != kind.applicationId && !(isNew && applicationId == 0))
        failOther(kind, file);
    requireKnownVersion(kind, theFile(kind, file), version);
    if (version < 0)
        failDamaged(kind, file, "schema " + std::to_string(version));
}

SQLite::Database openDatabase(fs::path const& file, DatabaseKind const& kind, Journal journal) {
    try {
        if (file == IN_MEMORY)
            return openAndMigrate(file, kind, journal);
        std::error_code error;
        if (!fs::exists(file, error))
            create(file, kind);
        else if (fs::is_regular_file(file, error) && fs::file_size(file, error) == 0)
            failDamaged(kind, file, "it is empty");
        return openAndMigrate(file, kind, journal);
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

} // namespace Database
