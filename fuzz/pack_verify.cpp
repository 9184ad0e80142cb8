// Verifying a mailing file: it is opened or refused in words, and what is called whole expands to what its
// headers say.
#include "fuzz/memory_file.h"
#include "programs/base/error.h"
#include "programs/vlmail/pack/container_check.h"
#include "vlservice/pack/page_loader.h"
#include "vlservice/platform/log.h"

#include <cstdint>
#include <cstdlib>

namespace {

void require(bool holds) {
    if (!holds)
        std::abort();
}

void check(VlMail::ContainerFile& container) {
    VlMail::ContainerCheck const result = VlMail::checkContainer(container);
    require(result.pages <= container.size() && result.documents <= result.pages);
    std::uint64_t stored = 0;
    for (unsigned long long i = 0; i < container.size(); ++i) {
        VlMail::ContainerFile::Blob const blob = container.blob(i);
        if (!blob.damage.empty())
            continue;
        stored += blob.bytes.size();
        require(blob.dataSize > 0 && PageLoaderI::unzipDbData(blob.bytes).size() == blob.dataSize);
    }
    require(stored <= container.fileSize());
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    Log::setSink({});
    MemoryFile const file(data, size);
    try {
        VlMail::ContainerFile container(file.path());
        check(container);
    } catch (Base::Error const& refusal) {
        require(*refusal.what() != '\0');
    }
    return 0;
}
