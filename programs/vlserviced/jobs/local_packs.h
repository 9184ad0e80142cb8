#pragma once
// The pack databases of clients on the same machine, which they name by a path.

#include "programs/mailing/pack_source.h"
#include "programs/vlserviced/store/job.h"

#include <filesystem>
#include <memory>

namespace VlServiced {

/// Only what lies below one folder is read, with no link leading out of it. May be used by any thread.
class LocalPacks {
public:
    /// Empty where no paths are taken. Throws Error when the folder is not there.
    explicit LocalPacks(std::filesystem::path const& folder);

    /// Throws Error when the path is none that is taken, and Database::DatabaseError.
    std::unique_ptr<Mailing::PackSource> open(PackLocation const& pack) const;

private:
    /// Without links.
    std::filesystem::path folder_;
};

} // namespace VlServiced
