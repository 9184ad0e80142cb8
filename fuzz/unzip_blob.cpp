// Undoing a blob's compression: the result has the claimed size or is empty, other data passes through, and
// whatever was compressed comes back.
#include "vlservice/pack/blob_format.h"
#include "vlservice/pack/little_endian.h"
#include "vlservice/pack/page_loader.h"
#include "vlservice/pack/page_saver.h"
#include "vlservice/platform/log.h"

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <optional>

namespace {

void require(bool holds) {
    if (!holds)
        std::abort();
}

std::optional<std::uint64_t> claimOf(SharedMemBuffer const& blob) {
    if (blob.size() < DB_ZIP_HEADER_SIZE ||
        std::memcmp(blob.data(), DB_ZIP_MAGIC.data(), DB_ZIP_MAGIC.size()) != 0)
        return std::nullopt;
    return LittleEndian::load<std::uint64_t>(blob.data() + DB_ZIP_MAGIC.size());
}

/// Claims that are believed, but for which the fuzzer would only fill memory with zeroes.
bool isCostly(std::uint64_t claim) { return claim > (1u << 24) && claim <= (1u << 30); }

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    Log::setSink({});
    SharedMemBuffer const given = SharedMemBuffer::copyOf(data, size);
    auto const claim = claimOf(given);
    if (!claim || !isCostly(*claim)) {
        SharedMemBuffer const got = PageLoaderI::unzipDbData(given);
        require(got.empty() || (claim ? got.size() == *claim : got.data() == given.data()));
    }
    SharedMemBuffer const back = PageLoaderI::unzipDbData(PageSaverI::zipDbData(given));
    require(back.size() == size && (size == 0 || std::memcmp(back.data(), data, size) == 0));
    return 0;
}
