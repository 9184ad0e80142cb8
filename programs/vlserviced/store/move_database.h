#pragma once
// All that a service keeps in databases, from one kind of database into another.

#include "programs/database/connection.h"

#include <filesystem>
#include <string>

namespace VlServiced {

class DataFolder;

struct MovedRecord {
    long long rows = 0;
    long long tables = 0;
};

/// Copies the database and the packs of a data folder, which nobody uses meanwhile, into an empty PostgreSQL
/// database, in one transaction, and compares counts and digests. From then on the files of the folder are
/// called "service.db.moved" and "packs.db.moved", and no service starts on them. Throws Error, one line.
MovedRecord moveToPostgres(DataFolder const& data, std::string const& address);

/// Throws Error when the database of the folder was moved away.
void requireNotMoved(DataFolder const& data);

/// Throws Error when the folder has a database of its own, which would be left behind by a service that uses
/// that one, and when that one has nothing although the folder's was to be moved there.
void requireMoved(DataFolder const& data, std::string const& address);

/// Copies what services keep in a PostgreSQL database, as it is at one moment, into new files. Throws
/// std::exception.
void copyFromPostgres(std::string const& address, std::filesystem::path const& database,
                      std::filesystem::path const& packs);

} // namespace VlServiced
