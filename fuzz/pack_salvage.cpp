// Salvaging a damaged container: the plan is made for any bytes, lies within the file, and every blob in it
// can be expanded.
#include "fuzz/memory_file.h"
#include "programs/vlmail/pack/salvage_plan.h"
#include "vlservice/pack/blob_format.h"
#include "vlservice/pack/page_loader.h"
#include "vlservice/platform/log.h"

#include <cstdint>
#include <cstdlib>

namespace {

void require(bool holds) {
    if (!holds)
        std::abort();
}

void check(VlMail::ByteFile& file, VlMail::FoundBlob const& blob) {
    require(blob.length <= file.size() && blob.offset <= file.size() - blob.length);
    SharedMemBuffer const salvaged = VlMail::salvagedBlob(file, blob);
    require(salvaged.size() > DB_ZIP_HEADER_SIZE);
    require(PageLoaderI::unzipDbData(salvaged).size() == blob.dataSize);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    Log::setSink({});
    MemoryFile const input(data, size);
    VlMail::ByteFile file(input.path());
    VlMail::SalvagePlan const plan = VlMail::planSalvage(file);
    for (VlMail::SavedPage const& page : plan.pages)
        check(file, page.blob);
    if (plan.metadata)
        check(file, *plan.metadata);
    return 0;
}
