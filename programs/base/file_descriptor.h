#pragma once
// An open file of the operating system.

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <string>
#include <string_view>

#include <sys/types.h>

namespace Base {

/// Closed with the object; never handed on to programs that are started. Every operation throws
/// std::system_error, with the file in its text, when the system refuses it; what a signal interrupts goes
/// on.
class FileDescriptor {
public:
    /// As open(2): "cannot open FILE". O_NOFOLLOW among the flags refuses a symbolic link.
    FileDescriptor(std::filesystem::path file, int flags, mode_t mode = 0);
    /// Takes over an open file, whose name is only told.
    FileDescriptor(int number, std::filesystem::path file);
    FileDescriptor(FileDescriptor&& other) noexcept;
    FileDescriptor& operator=(FileDescriptor&& other) noexcept;
    ~FileDescriptor();

    int number() const { return number_; }
    std::filesystem::path const& file() const { return file_; }

    /// Up to `count` bytes from where it stands; fewer only at the end.
    std::size_t read(void* to, std::size_t count);
    /// The same from a position, which stays where it is.
    std::size_t readAt(std::uint64_t position, void* to, std::size_t count) const;
    void writeAll(std::string_view bytes);
    /// Until the disk has it.
    void sync();
    /// A failure to close is a failure to write. May be called once.
    void close();

private:
    [[noreturn]] void fail(char const* what) const;

    std::filesystem::path file_;
    int number_;
};

/// The folder that a file lies in, "." for a bare name.
std::filesystem::path folderOf(std::filesystem::path const& file);

/// Makes the names in a folder last. Throws std::system_error: "cannot sync FOLDER".
void syncFolder(std::filesystem::path const& folder);

} // namespace Base
