#pragma once
// How databases fail towards people.

#include "programs/base/error.h"
#include "programs/database/migration.h"

#include <filesystem>
#include <string>
#include <vector>

namespace SQLite {
class Database;
class Exception;
} // namespace SQLite

namespace Database {

/// A failure with a database file as a person reads it: one line with the file and what can be done.
class DatabaseError : public Base::Error {
public:
    using Error::Error;
};

struct DatabaseKind {
    /// As messages name it: "pack database".
    char const* name;
    /// SQLite's application id, which stands in the file's header.
    int applicationId;
    /// Script i leads from schema version i to i + 1; the version that a program knows is their number.
    std::vector<Migration> migrations;
    /// Run on a new file, in front of all else: what cannot be changed later.
    char const* beginning = "";
};

/// "the pack database /srv/packs.db".
std::string theFile(DatabaseKind const& kind, std::filesystem::path const& file);
[[noreturn]] void failOther(DatabaseKind const& kind, std::filesystem::path const& file);
/// What SQLite says about a file that is being opened, as a DatabaseError.
[[noreturn]] void rethrow(SQLite::Exception const& failure, DatabaseKind const& kind,
                          std::filesystem::path const& file);

/// Throws DatabaseError when the version is beyond those that the kind knows; `database` is "the pack
/// database /srv/packs.db", say.
void requireKnownVersion(DatabaseKind const& kind, std::string const& database, long long version);
/// Throws DatabaseError unless the file is new, or of the kind and of a version that is known.
void requireKind(SQLite::Database& database, DatabaseKind const& kind, std::filesystem::path const& file);

} // namespace Database
