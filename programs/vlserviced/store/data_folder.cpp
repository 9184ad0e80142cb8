#include "programs/vlserviced/store/data_folder.h"

#include "programs/base/error.h"
#include "programs/base/pending_file.h"

#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <string>
#include <sys/file.h>
#include <sys/stat.h>
#include <system_error>
#include <unistd.h>
#include <utility>

namespace VlServiced {
namespace {

namespace fs = std::filesystem;

std::string processIn(int lock) {
    char text[32] = {};
    ssize_t const length = ::pread(lock, text, sizeof text - 1, 0);
    std::string const number(text, length > 0 ? static_cast<std::size_t>(length) : 0);
    return number.empty() ? "" : " (process " + number + ")";
}

/// The lock lies on the open file, so it goes with the process however that ends.
int takeHold(fs::path const& folder) {
    fs::path const file = folder / "lock";
    int const lock = ::open(file.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600);
    if (lock < 0)
        throw Base::Error("cannot write into the data folder " + folder.string() + ": " +
                          std::strerror(errno));
    if (::flock(lock, LOCK_EX | LOCK_NB) != 0) {
        std::string const holder = processIn(lock);
        ::close(lock);
        throw Base::Error("the data folder " + folder.string() + " is in use by another vlserviced" + holder +
                          ": stop that one or name another folder");
    }
    std::string const self = std::to_string(::getpid());
    if (::ftruncate(lock, 0) != 0 || ::pwrite(lock, self.data(), self.size(), 0) < 0) {
        int const error = errno;
        ::close(lock);
        throw Base::Error("cannot write into the data folder " + folder.string() + ": " +
                          std::strerror(error));
    }
    return lock;
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

DataFolder::~DataFolder() { ::close(lock_); }

} // namespace VlServiced
