#include "programs/base/unicode_memory.h"

#include "programs/base/out_of_memory.h"

#include <unicode/uclean.h>

#include <cstdlib>

namespace Base {
namespace {

MemorySource source;

/// Large pieces are texts that grow, which the library looks after.
template<typename Ask>
void* smallOnesForCertain(std::size_t size, Ask ask) {
    void* const block = ask();
    if (block || size > ENOUGH_TO_GO_ON)
        return block;
    endUnlessThereIsSome();
    void* const again = ask();
    if (!again)
        endOutOfMemory();
    return again;
}

void* U_CALLCONV allocate(void const* /*context*/, std::size_t size) {
    return smallOnesForCertain(size, [size] { return source.allocate(size); });
}

void* U_CALLCONV reallocate(void const* /*context*/, void* block, std::size_t size) {
    return smallOnesForCertain(size, [=] { return source.reallocate(block, size); });
}

void U_CALLCONV release(void const* /*context*/, void* block) { std::free(block); }

} // namespace

void holdUnicodeMemory(MemorySource from) noexcept {
    source = from;
    UErrorCode status = U_ZERO_ERROR;
    u_setMemoryFunctions(nullptr, &allocate, &reallocate, &release, &status);
}

} // namespace Base
