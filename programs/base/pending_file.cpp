#include "programs/base/pending_file.h"

#include "programs/base/file_descriptor.h"

#include <cerrno>
#include <cstdlib>
#include <fcntl.h>
#include <sys/stat.h>
#include <system_error>
#include <utility>

namespace Base {
namespace {

namespace fs = std::filesystem;

[[noreturn]] void fail(std::string const& what) {
    throw std::system_error(errno, std::generic_category(), what);
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
    FileDescriptor const file(::mkostemps(name.data(), 5, O_CLOEXEC), name);
    if (file.number() < 0)
        fail("cannot write into " + folderOf(target_).string());
    giveUsualRights(file.number());
    temporary_ = name;
}

PendingFile::~PendingFile() {
    std::error_code ignored;
    if (pending_)
        fs::remove(temporary_, ignored);
}

void PendingFile::commit() {
    FileDescriptor(temporary_, O_RDONLY).sync();
    if (::rename(temporary_.c_str(), target_.c_str()) != 0)
        fail("cannot write " + target_.string());
    pending_ = false;
    syncFolder(folderOf(target_));
}

void writeFile(fs::path const& target, std::string_view bytes) {
    PendingFile pending(target);
    FileDescriptor file(pending.temporary(), O_WRONLY);
    file.writeAll(bytes);
    file.close();
    pending.commit();
}

} // namespace Base
