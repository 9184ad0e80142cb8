#pragma once
// The service's database file: its kind and the history of its schema.

#include "programs/database/connection.h"

#include <filesystem>
#include <memory>

namespace VlServiced {

/// Schema version n is what the first n scripts make. A script that was published is never changed: a new
/// version is a new script behind it.
Database::DatabaseKind const& serviceDatabase();

/// Opens, or creates, the service's database and tests it for damage. Throws Database::DatabaseError.
std::unique_ptr<Database::Connection> openServiceDatabase(std::filesystem::path const& file);

/// Another connection to one that is open, to look at what is on record. Throws std::exception.
std::unique_ptr<Database::Connection> openToLook(std::filesystem::path const& file);

struct SharedDatabase {
    std::unique_ptr<Database::Connection> connection;
    /// Whether its schema was made by this very call.
    bool isNew = false;
};

/// The database of several services, with the schemas of all that they keep. Throws Database::DatabaseError.
SharedDatabase openSharedDatabase(std::string const& address);

} // namespace VlServiced
