#pragma once
// Files read whole.

#include <cstddef>
#include <filesystem>
#include <string>

namespace Base {

/// Larger than any document, and what a program can hold beside it.
constexpr std::size_t MAX_FILE_BYTES = std::size_t{1} << 30;

/// The bytes of an ordinary file. Throws Error, also when it has more than `limit` bytes.
std::string readFile(std::filesystem::path const& file, std::size_t limit = MAX_FILE_BYTES);

/// What comes from standard input until its end. Throws Error as readFile() does.
std::string readStandardInput(std::size_t limit = MAX_FILE_BYTES);

} // namespace Base
