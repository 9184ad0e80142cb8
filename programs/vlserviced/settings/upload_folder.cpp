#include "programs/vlserviced/settings/upload_folder.h"

#include "programs/base/error.h"
#include "programs/base/hex.h"

#include <array>
#include <cerrno>
#include <fcntl.h>
#include <random>
#include <sstream>
#include <sys/stat.h>
#include <system_error>
#include <unistd.h>
#include <utility>

namespace VlServiced {
namespace {

namespace fs = std::filesystem;

constexpr std::size_t MARK_BYTES = 32;

std::string newMark() {
    std::random_device random;
    std::array<unsigned char, MARK_BYTES / 2> bytes{};
    for (unsigned char& byte : bytes)
        byte = static_cast<unsigned char>(random());
    return Base::toHex(bytes);
}

[[noreturn]] void fail(std::string const& what) {
    throw std::system_error(errno, std::generic_category(), what);
}

/// The text of the mark; empty when there is none that could be one.
std::string markIn(int folder) {
    int const file =
        ::openat(folder, UploadFolder::MARK_FILE, O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);
    if (file < 0)
        return {};
    std::string text(MARK_BYTES, '\0');
    ssize_t const size = ::read(file, text.data(), text.size());
    ::close(file);
    bool const isWhole = size == static_cast<ssize_t>(MARK_BYTES);
    return isWhole && text.find_first_not_of("0123456789abcdef") == std::string::npos ? text : std::string();
}

} // namespace

std::string FolderIdentity::text() const {
    return std::to_string(device) + ' ' + std::to_string(inode) + ' ' + mark;
}

FolderIdentity FolderIdentity::fromText(std::string const& text) {
    FolderIdentity identity;
    std::istringstream(text) >> identity.device >> identity.inode >> identity.mark;
    return identity;
}

UploadFolder::UploadFolder(fs::path folder, std::string const& identity) : path_(std::move(folder)) {
    open();
    try {
        readIdentity();
        if (!identity.empty())
            requireIdentity(FolderIdentity::fromText(identity));
        else if (identity_.mark.empty())
            mark();
    } catch (...) {
        ::close(descriptor_);
        throw;
    }
}

UploadFolder::~UploadFolder() { ::close(descriptor_); }

void UploadFolder::open() {
    descriptor_ = ::open(path_.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (descriptor_ < 0)
        fail("there is no upload folder " + path_.string());
}

void UploadFolder::readIdentity() {
    struct stat status {};
    ::fstat(descriptor_, &status);
    identity_ = {status.st_dev, status.st_ino, markIn(descriptor_)};
}

void UploadFolder::requireIdentity(FolderIdentity const& wanted) const {
    if (!identity_.isSameAs(wanted))
        throw Base::Error("the upload folder " + path_.string() +
                          " is another one than before: mount the one whose file " + MARK_FILE + " reads " +
                          wanted.mark);
}

/// A mark that a crash left empty is written anew.
void UploadFolder::mark() {
    std::string const temporary = std::string(MARK_FILE) + '.' + newMark();
    int const file =
        ::openat(descriptor_, temporary.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0644);
    if (file < 0)
        fail("cannot write into the upload folder " + path_.string());
    std::string const text = newMark();
    bool const isWritten =
        ::write(file, text.data(), text.size()) == static_cast<ssize_t>(text.size()) && ::fsync(file) == 0;
    int const error = errno;
    ::close(file);
    if (!isWritten || ::renameat(descriptor_, temporary.c_str(), descriptor_, MARK_FILE) != 0) {
        ::unlinkat(descriptor_, temporary.c_str(), 0);
        errno = isWritten ? errno : error;
        fail("cannot write into the upload folder " + path_.string());
    }
    ::fsync(descriptor_);
    identity_.mark = markIn(descriptor_);
}

} // namespace VlServiced
