#pragma once
// A file that appears under its name only when it is whole: written beside it under a temporary name, synced,
// renamed.

#include <filesystem>
#include <string_view>

namespace Base {

/// Reserves a temporary name beside `target`. What was written there disappears with the object unless
/// commit() was called, so that neither a failure nor a full disk leaves half a file under the final name;
/// after a crash a file that begins with a dot and ends in ".part" may stay behind, and may be removed.
class PendingFile {
public:
    /// When the disk has the file: at once, or, for many files that can be made again, when the system likes.
    enum class Durability { Synced, Lazy };

    /// Throws std::system_error, with the folder in its text, when no file can be made there.
    explicit PendingFile(std::filesystem::path target);
    ~PendingFile();
    PendingFile(PendingFile const&) = delete;
    PendingFile& operator=(PendingFile const&) = delete;

    /// Where to write; the file exists and is empty.
    std::filesystem::path const& temporary() const { return temporary_; }
    std::filesystem::path const& target() const { return target_; }

    /// Syncs the file, gives it its name, replacing a file of that name, and syncs the folder.
    /// Throws std::system_error; the target is then as it was before. A folder that cannot be synced is
    /// logged only: the file is there, and whoever is told otherwise makes it a second time.
    void commit(Durability durability = Durability::Synced);

private:
    std::filesystem::path target_;
    std::filesystem::path temporary_;
    bool pending_ = true;
};

/// Writes a whole file by way of a PendingFile. Throws std::system_error.
void writeFile(std::filesystem::path const& target, std::string_view bytes,
               PendingFile::Durability durability = PendingFile::Durability::Synced);

/// From here on what ends the process from outside (SIGINT, SIGTERM, SIGHUP, SIGPIPE) removes its pending
/// files first, and a size limit is a failure to write. For programs of one thread; children are not meant.
void removePendingFilesOnSignals();

} // namespace Base
