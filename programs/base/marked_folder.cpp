#include "programs/base/marked_folder.h"

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

namespace Base {
namespace {

namespace fs = std::filesystem;

constexpr std::size_t MARK_BYTES = 32;

std::string newMark() {
    std::random_device random;
    std::array<unsigned char, MARK_BYTES / 2> bytes{};
    for (unsigned char& byte : bytes)
        byte = static_cast<unsigned char>(random());
    return toHex(bytes.data(), bytes.size());
}

[[noreturn]] void fail(std::string const& what) {
    throw std::system_error(errno, std::generic_category(), what);
}

FileDescriptor openFolder(fs::path const& folder, std::string const& inWords) {
    int const number = ::open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (number < 0)
        fail("there is no " + inWords + ' ' + folder.string());
    return {number, folder};
}

/// The text of the mark; empty when there is none that could be one.
std::string markIn(int folder) {
    int const number =
        ::openat(folder, MarkedFolder::MARK_FILE, O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);
    if (number < 0)
        return {};
    FileDescriptor file(number, MarkedFolder::MARK_FILE);
    std::string text(MARK_BYTES, '\0');
    bool const isWhole = file.read(text.data(), text.size()) == MARK_BYTES;
    return isWhole && text.find_first_not_of("0123456789abcdef") == std::string::npos ? text : std::string();
}

} // namespace

std::string temporaryOf(std::string const& name) { return "." + name + ".part"; }

std::string FolderIdentity::text() const {
    return std::to_string(device) + ' ' + std::to_string(inode) + ' ' + mark;
}

FolderIdentity FolderIdentity::fromText(std::string const& text) {
    FolderIdentity identity;
    std::istringstream(text) >> identity.device >> identity.inode >> identity.mark;
    return identity;
}

MarkedFolder::MarkedFolder(std::string inWords, fs::path const& folder, std::string const& identity)
    : inWords_(std::move(inWords)), folder_(openFolder(folder, inWords_)) {
    readIdentity();
    if (!identity.empty())
        requireIdentity(FolderIdentity::fromText(identity));
    else if (identity_.mark.empty())
        mark();
}

void MarkedFolder::readIdentity() {
    struct stat status {};
    ::fstat(descriptor(), &status);
    identity_ = {status.st_dev, status.st_ino, markIn(descriptor())};
}

void MarkedFolder::requireIdentity(FolderIdentity const& wanted) const {
    if (!identity_.isSameAs(wanted))
        throw Error(Base::Code::WrongFolder, "the " + inWords_ + ' ' + path().string() +
                                                 " is another one than before: mount the one whose file " +
                                                 MARK_FILE + " reads " + wanted.mark);
}

/// It appears whole, in place of whatever had its name.
void MarkedFolder::mark() {
    std::string const cannotWrite = "cannot write into the " + inWords_ + ' ' + path().string();
    std::string const temporary = std::string(MARK_FILE) + ".part";
    ::unlinkat(descriptor(), temporary.c_str(), 0);
    int const number =
        ::openat(descriptor(), temporary.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0644);
    if (number < 0)
        fail(cannotWrite);
    try {
        FileDescriptor file(number, path() / temporary);
        file.writeAll(newMark());
        file.sync();
        file.close();
        if (::renameat(descriptor(), temporary.c_str(), descriptor(), MARK_FILE) != 0)
            fail(cannotWrite);
    } catch (...) {
        ::unlinkat(descriptor(), temporary.c_str(), 0);
        throw;
    }
    ::fsync(descriptor());
    identity_.mark = markIn(descriptor());
}

void MarkedFolder::failAt(char const* what, std::string const& name) const {
    fail(what + (path() / name).string());
}

bool MarkedFolder::has(std::string const& name) const {
    struct stat status {};
    if (::fstatat(descriptor(), name.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0)
        return true;
    if (errno != ENOENT)
        failAt("cannot look for ", name);
    return false;
}

FileDescriptor MarkedFolder::newFile(std::string const& name, mode_t mode) const {
    ::unlinkat(descriptor(), name.c_str(), 0);
    int const file =
        ::openat(descriptor(), name.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, mode);
    if (file < 0)
        failAt("cannot write ", name);
    return {file, path() / name};
}

void MarkedFolder::rename(std::string const& from, std::string const& to) const {
    if (::renameat(descriptor(), from.c_str(), descriptor(), to.c_str()) != 0)
        failAt("cannot write ", to);
}

void MarkedFolder::removeIfThere(std::string const& name) const {
    if (::unlinkat(descriptor(), name.c_str(), 0) != 0 && errno != ENOENT)
        failAt("cannot remove ", name);
}

void MarkedFolder::sync() const {
    if (::fsync(descriptor()) != 0)
        fail("cannot sync " + path().string());
}

} // namespace Base
