#pragma once
// A backup as one file: what it holds one behind another, and a digest over all of it.

#include <filesystem>
#include <string>
#include <vector>

namespace VlServiced {

// The file, byte by byte:
//
//     VLSERVICED BACKUP 1\n
//     {"made": SECONDS, "members": [{"name": NAME, "bytes": N}, ...]}\n
//     the members' bytes, in that order
//     SHA-256 of all in front of it, 64 hexadecimal digits\n

/// Something that a backup holds.
struct BackupMember {
    /// "service.db", "packs.db", "token", or "outbox/ID.mailing".
    std::string name;
    /// Where its bytes are.
    std::filesystem::path file;
};

/// Writes a file of mode 0600, whole or not at all. `madeAt` is in seconds since the epoch. Throws Error when
/// there is one of that name, and std::system_error.
void writeBackup(std::filesystem::path const& target, std::vector<BackupMember> const& members,
                 long long madeAt);

/// Puts what a backup holds into an empty folder, and says when it was made. Throws Error, one line, when the
/// file is none, is damaged or cut off, and std::system_error; what lies in the folder then is of no use.
long long extractBackup(std::filesystem::path const& file, std::filesystem::path const& folder);

} // namespace VlServiced
