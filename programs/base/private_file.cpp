#include "programs/base/private_file.h"

#include "programs/base/error.h"
#include "programs/base/file_descriptor.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <string_view>
#include <system_error>
#include <utility>

namespace Base {
namespace {

constexpr mode_t OF_OTHERS = 077;
constexpr mode_t PERMISSIONS = 07777;

[[noreturn]] void fail(std::string_view what, std::string const& file, int error) {
    throw Error(Base::Code::FileUnreadable,
                std::string(what) + " \"" + file + "\": " + std::strerror(error) + '.');
}

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
        throw Error(Base::Code::FileUnsuitable, "\"" + file + "\" is not a file.");
    if (status.st_uid != ::geteuid() && status.st_uid != 0)
        throw Error(Base::Code::FileNotPrivate, "The file \"" + file + "\" belongs to another user.");
    mode_t const refused = status.st_uid == ::geteuid() ? OF_OTHERS : OF_OTHERS & ~S_IRGRP;
    if ((status.st_mode & refused) != 0)
        throw Error(Base::Code::FileNotPrivate, "The file \"" + file + "\" is open to others (mode " +
                                                    octal(status.st_mode & PERMISSIONS) +
                                                    "); make it private with chmod 600.");
}

/// Says what the system refused as a person reads it.
template<typename Operation>
decltype(auto) orError(std::string_view what, std::string const& file, Operation operation) {
    try {
        return operation();
    } catch (std::system_error const& failure) {
        fail(what, file, failure.code().value());
    }
}

void writeWhole(FileDescriptor descriptor, std::string_view contents, std::string const& file) {
    orError("Cannot write", file, [&] {
        descriptor.writeAll(contents);
        descriptor.sync();
        descriptor.close();
    });
}

/// Hidden, should the process be killed before it is linked to its name.
std::string draftOf(std::string const& file) {
    std::filesystem::path const path(file);
    return path.parent_path() / ('.' + path.filename().string() + '.' + std::to_string(::getpid()) + ".part");
}

} // namespace

std::string readPrivateFile(std::string const& file, std::size_t limit) {
    // Without waiting, should it be a pipe.
    auto descriptor =
        orError("Cannot open", file, [&] { return FileDescriptor(file, O_RDONLY | O_NONBLOCK); });
    requirePrivate(descriptor.number(), file);
    std::string contents(limit + 1, '\0');
    contents.resize(
        orError("Cannot read", file, [&] { return descriptor.read(contents.data(), contents.size()); }));
    if (contents.size() > limit)
        throw Error(Base::Code::FileUnsuitable,
                    "The file \"" + file + "\" is larger than " + std::to_string(limit) + " bytes.");
    return contents;
}

bool createPrivateFile(std::string const& file, std::string const& contents) {
    std::string const draft = draftOf(file);
    ::unlink(draft.c_str());
    auto descriptor = orError("Cannot create", file, [&] {
        return FileDescriptor(draft, O_WRONLY | O_CREAT | O_EXCL, S_IRUSR | S_IWUSR);
    });
    try {
        writeWhole(std::move(descriptor), contents, file);
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
    auto descriptor = orError("Cannot open", file, [&] {
        return FileDescriptor(file, O_WRONLY | O_CREAT | O_APPEND | O_NONBLOCK, S_IRUSR | S_IWUSR);
    });
    requirePrivate(descriptor.number(), file);
    writeWhole(std::move(descriptor), contents, file);
}

} // namespace Base
