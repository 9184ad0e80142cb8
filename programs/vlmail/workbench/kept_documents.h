#pragma once
// Documents that were read, as long as their files stay what they were.

#include "programs/reader/document.h"

#include <cstdint>
#include <filesystem>
#include <list>
#include <memory>
#include <string>
#include <sys/types.h>

namespace VlMail::Workbench {

/// What tells that a file is the one that was read.
struct FileMark {
    std::uint64_t device = 0;
    std::uint64_t inode = 0;
    std::uint64_t size = 0;
    std::int64_t modified = 0;

    friend bool operator==(FileMark const&, FileMark const&) = default;
};

/// As a text for those who only compare it.
std::string versionOf(FileMark const& mark);

/// Throws Base::Error for what is no ordinary file.
FileMark markOf(std::filesystem::path const& file);
/// Of a folder; another one when something comes into it or leaves it.
FileMark markOfFolder(std::filesystem::path const& folder);

class KeptDocuments {
public:
    /// The document of that file, read anew when it has changed; valid until the next call. Throws
    /// Base::Error.
    Reader::Document& document(std::filesystem::path const& file);

private:
    /// A folder of letters, as far as they are small; what is large is read anew when its turn comes again.
    static constexpr std::size_t MOST = 1'200;
    static constexpr std::uint64_t MOST_BYTES = std::uint64_t{64} << 20;

    void dropOldest();

    struct Kept {
        std::filesystem::path file;
        FileMark mark;
        Reader::Document document;
    };

    /// The last that was asked for is the first.
    std::list<Kept> kept_;
    std::uint64_t bytes_ = 0;
};

} // namespace VlMail::Workbench
