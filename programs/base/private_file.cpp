#include "programs/base/private_file.h"

#include "programs/base/error.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <string_view>
#include <utility>

namespace Base {
namespace {

constexpr mode_t OF_OTHERS = 077;
constexpr mode_t PERMISSIONS = 07777;

[[noreturn]] void fail(std::string_view what, std::string const& file, int error) {
    throw Base::Error(std::string(what) + " \"" + file + "\": " + std::strerror(error) + '.');
}

class Descriptor {
public:
    explicit Descriptor(int number) : number_(number) {}
    ~Descriptor() {
        if (number_ >= 0)
            ::close(number_);
    }
    Descriptor(Descriptor const&) = delete;
    Descriptor& operator=(Descriptor const&) = delete;

    operator int() const { return number_; }
    /// A failure to close is a failure to write.
    bool close() { return ::close(std::exchange(number_, -1)) == 0; }

private:
    int number_;
};

std::string octal(mode_t mode) {
    std::string digits;
    for (int shift = 9; shift >= 0; shift -= 3)
        digits += static_cast<char>('0' + (mode >> shift & 7));
    return digits;
}

void requirePrivate(int descriptor, std::string const& file) {
    struct stat status {};
    if (::fstat(descriptor, &status) != 0)
        fail("Cannot read", file, errno);
    if (!S_ISREG(status.st_mode))
        throw Base::Error("\"" + file + "\" is not a file.");
    if (status.st_uid != ::geteuid() && status.st_uid != 0)
        throw Base::Error("The file \"" + file + "\" belongs to another user.");
    if ((status.st_mode & OF_OTHERS) != 0)
        throw Base::Error("The file \"" + file + "\" is open to others (mode " +
                          octal(status.st_mode & PERMISSIONS) + "); make it private with chmod 600.");
}

void writeAll(int descriptor, std::string_view contents, std::string const& file) {
    while (!contents.empty()) {
        ssize_t const written = ::write(descriptor, contents.data(), contents.size());
        if (written < 0 && errno != EINTR)
            fail("Cannot write", file, errno);
        if (written > 0)
            contents.remove_prefix(static_cast<std::size_t>(written));
    }
    if (::fsync(descriptor) != 0)
        fail("Cannot write", file, errno);
}

} // namespace

std::string readPrivateFile(std::string const& file, std::size_t limit) {
    // Without waiting, should it be a pipe.
    Descriptor const descriptor(::open(file.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
    if (descriptor < 0)
        fail("Cannot open", file, errno);
    requirePrivate(descriptor, file);
    std::string contents(limit + 1, '\0');
    std::size_t filled = 0;
    while (filled < contents.size()) {
        ssize_t const got = ::read(descriptor, contents.data() + filled, contents.size() - filled);
        if (got < 0 && errno != EINTR)
            fail("Cannot read", file, errno);
        if (got == 0)
            break;
        if (got > 0)
            filled += static_cast<std::size_t>(got);
    }
    if (filled > limit)
        throw Base::Error("The file \"" + file + "\" is larger than " + std::to_string(limit) + " bytes.");
    contents.resize(filled);
    return contents;
}

bool createPrivateFile(std::string const& file, std::string const& contents) {
    std::string const draft = file + ".new." + std::to_string(::getpid());
    ::unlink(draft.c_str());
    Descriptor descriptor(::open(draft.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, S_IRUSR | S_IWUSR));
    if (descriptor < 0)
        fail("Cannot create", file, errno);
    try {
        writeAll(descriptor, contents, file);
        if (!descriptor.close())
            fail("Cannot write", file, errno);
        // Unlike a renaming, a link replaces nothing.
        bool const isNew = ::link(draft.c_str(), file.c_str()) == 0;
        if (!isNew && errno != EEXIST)
            fail("Cannot create", file, errno);
        ::unlink(draft.c_str());
        return isNew;
    } catch (...) {
        ::unlink(draft.c_str());
        throw;
    }
}

void appendToPrivateFile(std::string const& file, std::string const& contents) {
    Descriptor descriptor(
        ::open(file.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC | O_NONBLOCK, S_IRUSR | S_IWUSR));
    if (descriptor < 0)
        fail("Cannot open", file, errno);
    requirePrivate(descriptor, file);
    writeAll(descriptor, contents, file);
    if (!descriptor.close())
        fail("Cannot write", file, errno);
}

} // namespace Base
