#include "programs/base/read_file.h"

#include "programs/base/error.h"
#include "programs/base/file_descriptor.h"

#include <algorithm>
#include <cerrno>
#include <fcntl.h>
#include <sys/stat.h>
#include <system_error>
#include <unistd.h>

namespace Base {
namespace {

namespace fs = std::filesystem;

constexpr std::size_t STEP = std::size_t{1} << 16;

std::string inWords(std::error_code const& failure) {
    if (failure == std::errc::no_such_file_or_directory || failure == std::errc::not_a_directory)
        return "there is no such file; check the name";
    if (failure == std::errc::permission_denied || failure == std::errc::operation_not_permitted)
        return "no right to read it; change its permissions";
    return "cannot be read (" + failure.message() + "); copy it to another place";
}

void requireOrdinary(FileDescriptor const& file) {
    struct stat status {};
    if (::fstat(file.number(), &status) != 0)
        throw std::system_error(errno, std::generic_category());
    if (S_ISDIR(status.st_mode))
        throw Error(Base::Code::FileUnsuitable, file.file().string() + ": is a folder; name the files in it");
    if (!S_ISREG(status.st_mode))
        throw Error(Base::Code::FileUnsuitable,
                    file.file().string() + ": is no ordinary file; save it to one");
}

/// Grows with what comes: neither a file that grows meanwhile nor one that lies about its size is trusted.
std::string readAll(FileDescriptor& file, std::size_t limit) {
    std::string bytes;
    std::size_t step = STEP;
    for (std::size_t got = step; got == step;) {
        std::size_t const before = bytes.size();
        step = std::min(std::max(STEP, before), limit - before + 1);
        bytes.resize(before + step);
        got = file.read(bytes.data() + before, step);
        bytes.resize(before + got);
        if (bytes.size() > limit)
            throw Error(Base::Code::FileUnsuitable, file.file().string() + ": is larger than " +
                                                        std::to_string(limit) +
                                                        " bytes; name a smaller file");
    }
    return bytes;
}

} // namespace

std::string readFile(fs::path const& name, std::size_t limit) {
    try {
        // Without waiting, should it be a pipe.
        FileDescriptor file(name, O_RDONLY | O_NONBLOCK);
        requireOrdinary(file);
        return readAll(file, limit);
    } catch (std::system_error const& failure) {
        throw Error(Base::Code::FileUnreadable, name.string() + ": " + inWords(failure.code()));
    }
}

std::string readStandardInput(std::size_t limit) {
    try {
        FileDescriptor input(::fcntl(STDIN_FILENO, F_DUPFD_CLOEXEC, 0), "standard input");
        return readAll(input, limit);
    } catch (std::system_error const& failure) {
        throw Error(Base::Code::FileUnreadable, "standard input: " + inWords(failure.code()));
    }
}

} // namespace Base
