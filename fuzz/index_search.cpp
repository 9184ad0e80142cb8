// Finding the index of a container: the first eight bytes of an input say how far behind its bytes the file
// ends, the rest is the file. Candidates must lie in the file or before it, and the search must end.
#include "vlservice/pack/index_search.h"
#include "vlservice/pack/little_endian.h"

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <vector>

namespace {

void require(bool holds) {
    if (!holds)
        std::abort();
}

/// Reads as zeroes behind its bytes, as a hole does.
struct File {
    std::uint8_t const* bytes;
    std::int64_t size;
    std::int64_t end;

    bool read(std::int64_t position, char* to, std::size_t count) const {
        auto const wanted = static_cast<std::int64_t>(count);
        if (position < 0 || wanted > end || position > end - wanted)
            return false;
        std::memset(to, 0, count);
        if (position < size)
            std::memcpy(to, bytes + position, static_cast<std::size_t>(std::min(wanted, size - position)));
        return true;
    }
};

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    if (size < sizeof(std::uint64_t))
        return 0;
    auto const hole = LittleEndian::load<std::uint64_t>(data) >> 1;
    auto const bytes = static_cast<std::int64_t>(size - sizeof hole);
    std::int64_t const room = std::numeric_limits<std::int64_t>::max() - bytes;
    File const file{data + sizeof hole, bytes, bytes + std::min(static_cast<std::int64_t>(hole), room)};

    Container::IndexSearch::FirstBytes firstBytes;
    if (!file.read(0, firstBytes.data(), firstBytes.size()))
        return 0;
    Container::IndexSearch search(firstBytes, file.end, [&](auto position, auto* to, auto count) {
        return file.read(position, to, count);
    });
    std::vector<Container::IndexPlace> found;
    while (auto const place = search.next()) {
        require(place->size >= 0 && place->size < Container::INDEX_SIZE_LIMIT);
        require(place->position <= file.end - place->size);
        require(place->blobStart >= 0);
        require(std::find(found.begin(), found.end(), *place) == found.end());
        found.push_back(*place);
    }
    require(found.size() <= 2 && !search.failure().empty());
    return 0;
}
