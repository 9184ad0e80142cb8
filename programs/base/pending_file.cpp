#include "programs/base/pending_file.h"

#include <cerrno>
#include <cstdlib>
#include <fcntl.h>
#include <sys/stat.h>
#include <system_error>
#include <unistd.h>
#include <utility>

namespace Base {
namespace {

namespace fs = std::filesystem;

[[noreturn]] void fail(std::string const& what) {
    throw std::system_error(errno, std::generic_category(), what);
}

class FileDescriptor {
public:
    FileDescriptor(fs::path const& path, int flags) : number_(::open(path.c_str(), flags | O_CLOEXEC)) {
        if (number_ < 0)
            fail("cannot open " + path.string());
    }
    ~FileDescriptor() { ::close(number_); }
    FileDescriptor(FileDescriptor const&) = delete;
    FileDescriptor& operator=(FileDescriptor const&) = delete;

    operator int() const { return number_; }

private:
    int number_;
};

void sync(fs::path const& path, int flags) {
    FileDescriptor const file(path, flags);
    if (::fsync(file) != 0)
        fail("cannot sync " + path.string());
}

fs::path folderOf(fs::path const& file) {
    return file.has_parent_path() ? file.parent_path() : fs::path(".");
}

/// The rights that a file made by open() would have; temporary files begin with fewer.
void giveUsualRights(int file) {
    mode_t const mask = ::umask(0);
    ::umask(mask);
    ::fchmod(file, 0666 & ~mask);
}

} // namespace

PendingFile::PendingFile(fs::path target) : target_(std::move(target)) {
    std::string name = (folderOf(target_) / ".XXXXXX.part").string();
    int const file = ::mkstemps(name.data(), 5);
    if (file < 0)
        fail("cannot write into " + folderOf(target_).string());
    giveUsualRights(file);
    ::close(file);
    temporary_ = name;
}

PendingFile::~PendingFile() {
    std::error_code ignored;
    if (pending_)
        fs::remove(temporary_, ignored);
}

void PendingFile::commit() {
    sync(temporary_, O_RDONLY);
    if (::rename(temporary_.c_str(), target_.c_str()) != 0)
        fail("cannot write " + target_.string());
    pending_ = false;
    sync(folderOf(target_), O_RDONLY | O_DIRECTORY);
}

void writeFile(fs::path const& target, std::string const& bytes) {
    PendingFile pending(target);
    {
        FileDescriptor const file(pending.temporary(), O_WRONLY);
        for (std::size_t written = 0; written < bytes.size();) {
            ssize_t const step = ::write(file, bytes.data() + written, bytes.size() - written);
            if (step < 0 && errno != EINTR)
                fail("cannot write " + target.string());
            if (step > 0)
                written += static_cast<std::size_t>(step);
        }
    }
    pending.commit();
}

} // namespace Base
