#pragma once
// A file that appears under its name only when it is whole: written beside it under a temporary name, synced,
// renamed.

#include <filesystem>
#include <list>
#include <string>
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

    /// Where to write; the file exists and is empty. An absolute path.
    std::filesystem::path const& temporary() const { return temporary_; }
    std::filesystem::path const& target() const { return target_; }

    /// Syncs the file, gives it its name, replacing a file of that name, and syncs the folder.
    /// Throws std::system_error; the target is then as it was before. A folder that cannot be synced is
    /// logged only: the file is there, and whoever is told otherwise makes it a second time.
    void commit(Durability durability = Durability::Synced);

private:
    /// The file under its temporary name, which goes with the object.
    class Temporary {
    public:
        explicit Temporary(std::filesystem::path const& target);
        ~Temporary();
        Temporary(Temporary const&) = delete;
        Temporary& operator=(Temporary const&) = delete;

        std::string const& name() const { return *name_; }
        /// It has another name by now.
        void leave() { isLeft_ = true; }

    private:
        /// Among those of all pending files.
        std::list<std::string>::iterator name_;
        bool isLeft_ = false;
    };

    std::filesystem::path target_;
    Temporary file_;
    std::filesystem::path temporary_;
};

/// Writes a whole file by way of a PendingFile. Throws std::system_error.
void writeFile(std::filesystem::path const& target, std::string_view bytes,
               PendingFile::Durability durability = PendingFile::Durability::Synced);

/// From here on what ends the process from outside (SIGINT, SIGTERM, SIGHUP, SIGPIPE) removes its pending
/// files first, and a size limit is a failure to write. For programs of one thread; children are not meant.
void removePendingFilesOnSignals();

/// Removes them as such a signal does, without taking memory; nothing where removePendingFilesOnSignals() was
/// not called, and in children. For a process that ends at once.
void removePendingFiles() noexcept;

} // namespace Base
