#include "programs/vlserviced/store/data_folder.h"

#include "programs/base/error.h"
#include "programs/base/pending_file.h"

#include <string>
#include <system_error>
#include <utility>

namespace VlServiced {
namespace {

namespace fs = std::filesystem;

/// The lock goes with the process however that ends.
Base::FileLock takeHold(fs::path const& folder) {
    fs::path const file = folder / "lock";
    try {
        if (auto lock = Base::FileLock::tryTake(file))
            return std::move(*lock);
    } catch (std::system_error const& failure) {
        throw Base::Error("cannot write into the data folder " + folder.string() + ": " +
                          failure.code().message());
    }
    std::string const holder = Base::FileLock::holderOf(file);
    throw Base::Error("the data folder " + folder.string() + " is in use by another vlserviced" +
                      (holder.empty() ? "" : " (process " + holder + ")") +
                      ": stop that one or name another folder");
}

} // namespace

void makeWritableFolder(fs::path const& folder) {
    try {
        if (fs::create_directories(folder))
            fs::permissions(folder, fs::perms::owner_all);
        Base::PendingFile const probe(folder / "probe");
    } catch (std::system_error const& failure) {
        throw Base::Error("cannot write into the folder " + folder.string() + ": " +
                          failure.code().message());
    }
}

DataFolder::DataFolder(fs::path folder) : folder_(std::move(folder)) {
    makeWritableFolder(folder_);
    lock_ = takeHold(folder_);
}

} // namespace VlServiced
