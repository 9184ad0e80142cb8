#include "vlservice/pack/index_search.h"

#include "vlservice/pack/little_endian.h"

#include <algorithm>
#include <utility>

namespace Container {
namespace {

/// The sum of two numbers from outside, the first not negative, or the limit when it would be greater.
std::int64_t sumUpTo(std::int64_t limit, std::int64_t a, std::int64_t b) {
    return a > limit || b > limit - a ? limit : a + b;
}

} // namespace

IndexSearch::IndexSearch(FirstBytes const& firstBytes, std::int64_t fileEnd, ReadAt readAt)
    : firstBytes_(firstBytes), fileEnd_(fileEnd), readAt_(std::move(readAt)) {}

std::optional<IndexPlace> IndexSearch::next() {
    // The first two layouts are looked for once. A retry after a candidate of no size would otherwise get the
    // same candidate again, without end.
    if (std::exchange(first_, false)) {
        for (auto const layout : {&IndexSearch::byWideHeader, &IndexSearch::byTrailingOffset}) {
            Outcome const outcome = (this->*layout)();
            if (outcome == Outcome::Found)
                return place_;
            if (outcome == Outcome::Failed)
                return std::nullopt;
        }
    }
    if (byLeadingOffset() == Outcome::Found)
        return place_;
    fail("Failed to find meta in");
    return std::nullopt;
}

IndexSearch::Outcome IndexSearch::byWideHeader() {
    if (!hasWideMagic())
        return Outcome::NotHere;
    auto const idLength = readNumber<std::uint32_t>(WIDE_ID_LENGTH_AT);
    if (!idLength)
        return fail("Failed to read id from");
    place_.blobStart = WIDE_ID_LENGTH_AT + WIDE_ID_EXTRA + *idLength;

    std::int64_t const trailer = fileEnd_ - WIDE_TRAILER_SIZE;
    auto const fromBlobStart = readNumber<std::uint64_t>(trailer);
    // The number that is told is the position before this step, so -1, and not the one that was read:
    // deliberate, programs that read the log know the line in this form.
    if (!fromBlobStart || static_cast<std::int64_t>(*fromBlobStart) < 0)
        return fail("Failed to read valid meta position (" + std::to_string(place_.position) + ") from");
    place_.position = sumUpTo(trailer + 1, place_.blobStart, static_cast<std::int64_t>(*fromBlobStart));
    // Beyond the trailer: a single byte cannot be an index, so that the search goes on.
    if (place_.position > trailer)
        place_.position = trailer - 1;
    return upTo(trailer);
}

IndexSearch::Outcome IndexSearch::byTrailingOffset() {
    if (!hasBlobAt(0))
        return Outcome::NotHere;
    std::int64_t const trailer = fileEnd_ - static_cast<std::int64_t>(OFFSET_SIZE);
    auto const position = readNumber<std::uint64_t>(trailer);
    if (!position)
        return fail("Failed to read meta offset from");
    place_.position = static_cast<std::int64_t>(*position);
    return place_.position < trailer ? upTo(trailer) : Outcome::NotHere;
}

IndexSearch::Outcome IndexSearch::byLeadingOffset() {
    if (!hasBlobAt(OFFSET_SIZE))
        return Outcome::NotHere;
    IndexPlace const before = place_;
    place_.position = static_cast<std::int64_t>(LittleEndian::load<std::uint64_t>(firstBytes_.data()));
    if (place_.position >= fileEnd_)
        return Outcome::NotHere;
    Outcome const outcome = upTo(fileEnd_);
    return place_ == before ? Outcome::NotHere : outcome;
}

bool IndexSearch::hasWideMagic() const {
    for (std::size_t i = 0; i <= WIDE_MAGIC.size(); ++i) {
        char16_t const expected = i < WIDE_MAGIC.size() ? WIDE_MAGIC[i] : u'\0';
        if (LittleEndian::load<std::uint16_t>(firstBytes_.data() + i * sizeof(char16_t)) != expected)
            return false;
    }
    return true;
}

bool IndexSearch::hasBlobAt(std::size_t position) const {
    return std::equal(BLOB_START.begin(), BLOB_START.end(), firstBytes_.begin() + position);
}

template<typename Unsigned>
std::optional<Unsigned> IndexSearch::readNumber(std::int64_t position) const {
    char bytes[sizeof(Unsigned)];
    if (!readAt_(position, bytes, sizeof bytes))
        return std::nullopt;
    return LittleEndian::load<Unsigned>(bytes);
}

/// The candidate runs from the position to `indexEnd`. One that begins before the file is a candidate
/// whatever its size: the import shall fail at reading it, not go on to another layout.
IndexSearch::Outcome IndexSearch::upTo(std::int64_t indexEnd) {
    std::int64_t const lowest = indexEnd - INDEX_SIZE_LIMIT + 1;
    if (place_.position >= 0 && place_.position < lowest)
        return Outcome::NotHere;
    place_.size = indexEnd - std::max(place_.position, lowest);
    return Outcome::Found;
}

IndexSearch::Outcome IndexSearch::fail(std::string failure) {
    failure_ = std::move(failure);
    return Outcome::Failed;
}

} // namespace Container
