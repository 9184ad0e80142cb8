#pragma once
// The folder that holds everything the service keeps: who may use it, and what lies where in it.

#include "programs/base/file_lock.h"

#include <filesystem>
#include <optional>

namespace VlServiced {

/// A data folder in use by this process and no other.
class DataFolder {
public:
    /// Makes the folder, which only its owner may enter, unless it is there, and takes hold of it until
    /// destruction. Throws Error when it cannot be written, when another process has it, and when it belongs
    /// to another user or others may write it.
    explicit DataFolder(std::filesystem::path folder);
    DataFolder(DataFolder const&) = delete;
    DataFolder& operator=(DataFolder const&) = delete;

    std::filesystem::path const& path() const { return folder_; }
    std::filesystem::path database() const { return folder_ / "service.db"; }
    /// The packs that clients have sent over connections.
    std::filesystem::path packs() const { return folder_ / "packs.db"; }
    std::filesystem::path token() const { return folder_ / "token"; }
    /// Where finished containers wait unless another folder was named.
    std::filesystem::path outbox() const { return folder_ / "outbox"; }

    /// Makes what a restored folder holds this one's, whatever ends the process in between: the next one that
    /// uses this folder goes on with it. There is nothing of the same names here.
    void adopt(std::filesystem::path const& restored);

private:
    void finishAdopting() const;

    std::filesystem::path folder_;
    std::optional<Base::FileLock> lock_;
};

/// Makes a folder, with its parents, unless it is there, and tests that files can be made in it.
/// Throws Error.
void makeWritableFolder(std::filesystem::path const& folder);

} // namespace VlServiced
