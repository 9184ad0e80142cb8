#pragma once
// A file that is only read, anywhere in it.

#include "programs/base/file_descriptor.h"

#include <cstdint>
#include <filesystem>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

namespace VlMail {

/// Reads up to `count` bytes at a position; gives how many there were, fewer only at the end.
using ReadBytes = std::function<std::size_t(std::uint64_t position, void* to, std::size_t count)>;

class ByteFile {
public:
    /// Throws Error when it is no file that can be read.
    explicit ByteFile(std::filesystem::path const& path);

    std::filesystem::path const& path() const { return file_.file(); }
    std::uint64_t size() const { return size_; }

    /// As ReadBytes. Throws Error when the disk fails, as the others do.
    std::size_t read(std::uint64_t position, void* to, std::size_t count);
    /// What there is of `count` bytes; valid until the next call of anything.
    std::string_view bytesAt(std::uint64_t position, std::size_t count);
    /// Where the text, not empty, stands next from a position on.
    std::optional<std::uint64_t> find(std::string_view text, std::uint64_t from);

private:
    void moveWindow(std::uint64_t position, std::size_t count);
    /// Past the window.
    std::size_t readPast(std::uint64_t position, char* to, std::size_t count) const;

    Base::FileDescriptor file_;
    std::uint64_t size_ = 0;
    /// A stretch of the file: what is asked for lies mostly close to what was asked for before.
    std::string window_;
    std::uint64_t windowAt_ = 0;
};

} // namespace VlMail
