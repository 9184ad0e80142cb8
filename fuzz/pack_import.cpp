// Importing a container from a file that lives in memory: nothing is thrown, and every blob that comes out
// has the length and the checksum that the index says.
#include "fuzz/memory_file.h"
#include "vlservice/pack/pack_wrapper.h"
#include "vlservice/platform/log.h"

#include <zlib.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>

namespace {

void require(bool holds) {
    if (!holds)
        std::abort();
}

void check(SharedMemBuffer const& blob, PackWrapper::BinEntry const& entry) {
    require(blob.empty() ||
            (blob.size() == entry.length && crc32(0, blob.data(), entry.length) == entry.crc));
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    Log::setSink({});
    MemoryFile const file(data, size);
    PackWrapper container(file.path(), PackWrapper::PURPOSE_IMPORT, "unused");
    auto const entries = std::min<unsigned long long>(container.szBins(), 100);
    for (unsigned long long i = 0; i < entries; ++i) {
        PackWrapper::BinEntry const& entry = container.bin(i);
        check(container.binData(i), entry);
        bool called = false;
        container.requestPageData(entry.document, entry.name, [&](SharedMemBuffer) { called = true; });
        require(called);
    }
    container.inputFullMeta();
    container.requestPageData("no such document", "no such page", [](SharedMemBuffer) {});
    return 0;
}
