#include "programs/vlserviced/store/data_folder.h"

#include "programs/base/error.h"
#include "programs/base/file_descriptor.h"
#include "programs/base/pending_file.h"

#include <cerrno>
#include <cstring>
#include <string>
#include <sys/stat.h>
#include <system_error>
#include <unistd.h>
#include <utility>

namespace VlServiced {
namespace {

namespace fs = std::filesystem;

/// What was restored and is whole.
constexpr char const* RESTORED = "restored";

/// The lock goes with the process however that ends.
Base::FileLock takeHold(fs::path const& folder) {
    fs::path const file = folder / "lock";
    try {
        if (auto lock = Base::FileLock::tryTake(file))
            return std::move(*lock);
    } catch (std::system_error const& failure) {
        throw Base::Error(Base::Code::DataFolderUnusable, "cannot write into the data folder " +
                                                              folder.string() + ": " +
                                                              failure.code().message());
    }
    std::string const holder = Base::FileLock::holderOf(file);
    throw Base::Error(Base::Code::DataFolderBusy, "the data folder " + folder.string() +
                                                      " is in use by another vlserviced" +
                                                      (holder.empty() ? "" : " (process " + holder + ")") +
                                                      ": stop that one or name another folder");
}

/// Who may write here could put another token, database or container in place.
void requireOwn(fs::path const& folder) {
    struct stat status {};
    if (::stat(folder.c_str(), &status) != 0)
        throw Base::Error(Base::Code::DataFolderUnusable,
                          "cannot read the data folder " + folder.string() + ": " + std::strerror(errno));
    if (status.st_uid != ::geteuid())
        throw Base::Error(
            Base::Code::DataFolderUnusable,
            "the data folder " + folder.string() +
                " belongs to another user: start vlserviced as that user or name another folder");
    if ((status.st_mode & (S_IWGRP | S_IWOTH)) != 0)
        throw Base::Error(Base::Code::DataFolderUnusable, "others may write into the data folder " +
                                                              folder.string() +
                                                              ": take their right away (chmod go-w)");
}

} // namespace

void makeWritableFolder(fs::path const& folder) {
    try {
        if (fs::create_directories(folder))
            fs::permissions(folder, fs::perms::owner_all);
        Base::PendingFile const probe(folder / "probe");
    } catch (std::system_error const& failure) {
        throw Base::Error(Base::Code::DataFolderUnusable,
                          "cannot write into the folder " + folder.string() + ": " +
                              failure.code().message() +
                              "; give this user the right to, or name another folder");
    }
}

DataFolder::DataFolder(fs::path folder) : folder_(std::move(folder)) {
    makeWritableFolder(folder_);
    requireOwn(folder_);
    lock_ = takeHold(folder_);
    finishAdopting();
}

void DataFolder::adopt(fs::path const& restored) {
    Base::syncFolder(restored);
    fs::rename(restored, folder_ / RESTORED);
    Base::syncFolder(folder_);
    finishAdopting();
}

/// The database goes last: without it there is none.
void DataFolder::finishAdopting() const {
    fs::path const restored = folder_ / RESTORED;
    if (!fs::exists(restored))
        return;
    for (fs::path const& file : {token(), packs(), database()})
        if (fs::path const from = restored / file.filename(); fs::exists(from))
            fs::rename(from, file);
    Base::syncFolder(folder_);
    fs::remove_all(restored);
}

} // namespace VlServiced
