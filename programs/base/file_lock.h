#pragma once
// One process at a time.

#include "programs/base/file_descriptor.h"

#include <optional>
#include <string>

namespace Base {

/// A lock on a file, which says which process holds it. It goes with the object, and with the process
/// however that ends; the file stays.
class FileLock {
public:
    /// Makes the file, for its owner alone, when it is missing. Nothing when another holds it. Throws
    /// std::system_error.
    static std::optional<FileLock> tryTake(std::filesystem::path const& file);

    /// The number of the process that holds it, or did last; empty when that cannot be told.
    static std::string holderOf(std::filesystem::path const& file);

private:
    explicit FileLock(FileDescriptor file);

    FileDescriptor file_;
};

} // namespace Base
