#include "vlservice/pack/page_saver.h"

#include "vlservice/pack/blob_format.h"
#include "vlservice/pack/little_endian.h"
#include "vlservice/platform/log.h"

#include <zlib.h>

#include <cstdint>
#include <cstring>
#include <new>
#include <utility>

namespace {

SharedMemBuffer notCompressed() {
    Log::Lock(3).logStreamLine() << "Failed to compress data for db";
    return {};
}

SharedMemBuffer compress(Bytef const* data, std::uint64_t size) {
    auto const streamed = static_cast<std::uint32_t>(size);
    uLongf length = compressBound(streamed);
    SharedMemBuffer blob;
    blob.resize(length + DB_ZIP_HEADER_SIZE);
    std::memcpy(blob.data(), DB_ZIP_MAGIC.data(), DB_ZIP_MAGIC.size());
    LittleEndian::store(size, blob.data() + DB_ZIP_MAGIC.size());
    if (compress2(blob.data() + DB_ZIP_HEADER_SIZE, &length, data, streamed, DB_ZIP_LEVEL) != Z_OK)
        return notCompressed();
    blob.resize(length + DB_ZIP_HEADER_SIZE);
    return blob;
}

} // namespace

PageSaverI::PageSaverI(std::string packId) : packId_(std::move(packId)) {}

PageSaverI::~PageSaverI() = default;

SharedMemBuffer PageSaverI::zipDbData(void const* data, unsigned long long size) {
    try {
        return compress(static_cast<Bytef const*>(data), size);
    } catch (std::bad_alloc const&) {
        return notCompressed();
    }
}

SharedMemBuffer PageSaverI::zipDbData(SharedMemBuffer data) { return zipDbData(data.data(), data.size()); }
