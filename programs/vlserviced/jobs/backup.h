#pragma once
// The service's record as one file, and a service that goes on from such a file.

#include <filesystem>
#include <string>

namespace VlServiced {

/// Where a service keeps what it does.
struct KeptAt {
    std::filesystem::path data;
    std::filesystem::path outbox;
    /// Of a PostgreSQL database; empty for the data folder's own.
    std::string database = {};
};

/// Writes what a service on a data folder keeps into a new file, while it runs or not: the database and then
/// the packs, each as it was at one moment, containers that cannot be made of them, and the token. Seconds
/// since the epoch. Throws std::exception with one line for a person.
void backUp(KeptAt const& kept, std::filesystem::path const& target, long long now);

/// What the service did behind the backup.
enum class Since {
    /// Whatever was to be handed over may have been.
    Unknown,
    Nothing,
};

struct RestoredRecord {
    /// Seconds since the epoch.
    long long madeAt = 0;
    /// That are held until a person decides.
    long long doubtfulJobs = 0;
    long long doubtfulLetters = 0;
    /// That were found in the upload folder.
    long long foundJobs = 0;
};

/// Makes the record of a data folder out of a backup, whole or not at all; the folder has none yet. A mailing
/// that may have been handed over behind the backup is found in the upload folder, or held until a person
/// decides; a letter for a carrier is uncertain. Throws std::exception with one line for a person.
RestoredRecord restoreBackup(std::filesystem::path const& file, std::filesystem::path const& data,
                             std::filesystem::path const& outbox, Since since, long long now);

} // namespace VlServiced
