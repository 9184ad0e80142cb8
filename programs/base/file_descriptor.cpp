#include "programs/base/file_descriptor.h"

#include <algorithm>
#include <cerrno>
#include <fcntl.h>
#include <system_error>
#include <unistd.h>
#include <utility>

namespace Base {
namespace {

/// A call with millions of bytes takes twice as long as many with as much together: the system looks for
/// pages that lie side by side.
constexpr std::size_t WRITTEN_AT_ONCE = 1 << 17;

/// Repeats what a signal interrupts.
template<typename Call>
ssize_t unlessInterrupted(Call call) {
    ssize_t result = 0;
    do
        result = call();
    while (result < 0 && errno == EINTR);
    return result;
}

/// Until all bytes are there or no more come; below 0 when a step fails.
template<typename Step>
ssize_t inSteps(std::size_t count, Step step) {
    std::size_t done = 0;
    while (done < count) {
        ssize_t const more = unlessInterrupted([&] { return step(done); });
        if (more < 0)
            return more;
        if (more == 0)
            break;
        done += static_cast<std::size_t>(more);
    }
    return static_cast<ssize_t>(done);
}

} // namespace

FileDescriptor::FileDescriptor(std::filesystem::path file, int flags, mode_t mode)
    : file_(std::move(file)), number_(static_cast<int>(unlessInterrupted(
                                  [&] { return ::open(file_.c_str(), flags | O_CLOEXEC, mode); }))) {
    if (number_ < 0)
        fail("cannot open ");
}

FileDescriptor::FileDescriptor(int number, std::filesystem::path file)
    : file_(std::move(file)), number_(number) {}

FileDescriptor::FileDescriptor(FileDescriptor&& other) noexcept
    : file_(std::move(other.file_)), number_(std::exchange(other.number_, -1)) {}

FileDescriptor& FileDescriptor::operator=(FileDescriptor&& other) noexcept {
    std::swap(file_, other.file_);
    std::swap(number_, other.number_);
    return *this;
}

FileDescriptor::~FileDescriptor() {
    if (number_ >= 0)
        ::close(number_);
}

std::size_t FileDescriptor::read(void* to, std::size_t count) {
    ssize_t const got = inSteps(count, [&](std::size_t done) {
        return ::read(number_, static_cast<char*>(to) + done, count - done);
    });
    if (got < 0)
        fail("cannot read ");
    return static_cast<std::size_t>(got);
}

std::size_t FileDescriptor::readAt(std::uint64_t position, void* to, std::size_t count) const {
    ssize_t const got = inSteps(count, [&](std::size_t done) {
        return ::pread(number_, static_cast<char*>(to) + done, count - done,
                       static_cast<off_t>(position + done));
    });
    if (got < 0)
        fail("cannot read ");
    return static_cast<std::size_t>(got);
}

void FileDescriptor::writeAll(std::string_view bytes) {
    ssize_t const written = inSteps(bytes.size(), [&](std::size_t done) {
        return ::write(number_, bytes.data() + done, std::min(bytes.size() - done, WRITTEN_AT_ONCE));
    });
    if (written < 0)
        fail("cannot write ");
}

void FileDescriptor::sync() {
    if (unlessInterrupted([&] { return ::fsync(number_); }) != 0)
        fail("cannot sync ");
}

void FileDescriptor::close() {
    if (::close(std::exchange(number_, -1)) != 0)
        fail("cannot write ");
}

void FileDescriptor::fail(char const* what) const {
    throw std::system_error(errno, std::generic_category(), what + file_.string());
}

std::filesystem::path folderOf(std::filesystem::path const& file) {
    return file.has_parent_path() ? file.parent_path() : std::filesystem::path(".");
}

void syncFolder(std::filesystem::path const& folder) {
    FileDescriptor(folder, O_RDONLY | O_DIRECTORY).sync();
}

} // namespace Base
