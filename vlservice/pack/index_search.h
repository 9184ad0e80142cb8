#pragma once
// Finds the index of a container, without a file: from its first bytes, its end and a way to read.

#include "vlservice/pack/container_format.h"

#include <array>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>

namespace Container {

/// A stretch of the file that may be the index.
struct IndexPlace {
    /// May be negative, however far: reading there is what fails then.
    std::int64_t position;
    /// Below INDEX_SIZE_LIMIT; of a stretch from a negative position no more of it is told.
    std::int64_t size;
    /// Added to every offset of this index.
    std::int64_t blobStart;

    bool operator==(IndexPlace const&) const = default;
};

/// Gives the places where the index may be, each once, the likeliest first: the next is asked for when the
/// one before could not be parsed. All arithmetic is checked; nothing that the file says can overflow it.
class IndexSearch {
public:
    using FirstBytes = std::array<char, FIRST_BYTES_SIZE>;
    /// Reads `count` bytes at a position; false unless all of them are there.
    using ReadAt = std::function<bool(std::int64_t position, char* to, std::size_t count)>;

    IndexSearch(FirstBytes const& firstBytes, std::int64_t fileEnd, ReadAt readAt);

    /// None when there are no more, or when the file could not be read; failure() is set then.
    std::optional<IndexPlace> next();

    /// Why next() gave none: what failed, up to the words " import file ".
    std::string const& failure() const { return failure_; }

private:
    enum class Outcome { Found, NotHere, Failed };

    Outcome byWideHeader();
    Outcome byTrailingOffset();
    Outcome byLeadingOffset();

    bool hasWideMagic() const;
    bool hasBlobAt(std::size_t position) const;
    template<typename Unsigned>
    std::optional<Unsigned> readNumber(std::int64_t position) const;
    Outcome upTo(std::int64_t indexEnd);
    Outcome fail(std::string failure);

    FirstBytes const firstBytes_;
    std::int64_t const fileEnd_;
    ReadAt const readAt_;
    bool first_ = true;
    IndexPlace place_{-1, 0, 0};
    std::string failure_;
};

} // namespace Container
