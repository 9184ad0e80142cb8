#include "programs/base/file_lock.h"

#include <cerrno>
#include <fcntl.h>
#include <sys/file.h>
#include <system_error>
#include <unistd.h>
#include <utility>

namespace Base {
namespace {

[[noreturn]] void fail(std::filesystem::path const& file) {
    throw std::system_error(errno, std::generic_category(), "cannot lock " + file.string());
}

} // namespace

std::optional<FileLock> FileLock::tryTake(std::filesystem::path const& file) {
    FileDescriptor opened(file, O_RDWR | O_CREAT | O_NOFOLLOW, 0600);
    if (::flock(opened.number(), LOCK_EX | LOCK_NB) == 0)
        return FileLock(std::move(opened));
    if (errno != EWOULDBLOCK)
        fail(file);
    return std::nullopt;
}

std::string FileLock::holderOf(std::filesystem::path const& file) {
    try {
        char text[20];
        std::size_t const length = FileDescriptor(file, O_RDONLY | O_NOFOLLOW).readAt(0, text, sizeof text);
        return std::string(text, length);
    } catch (std::system_error const&) {
        return {};
    }
}

FileLock::FileLock(FileDescriptor file) : file_(std::move(file)) {
    if (::ftruncate(file_.number(), 0) != 0)
        fail(file_.file());
    file_.writeAll(std::to_string(::getpid()));
}

} // namespace Base
