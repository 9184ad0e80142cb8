#include "tests/support/failing_memory.h"

#include <cstdlib>
#include <new>

namespace {

/// Calls until the one that fails; 0 when none is to.
thread_local long callsLeft = 0;
thread_local bool staysOut = false;
thread_local bool failed = false;

/// Whether this call finds nothing.
bool isRefused() {
    if (callsLeft == 0 || --callsLeft > 0)
        return false;
    callsLeft = staysOut ? 1 : 0;
    failed = true;
    return true;
}

} // namespace

namespace VLServiceTest {

FailingMemory::FailingMemory(long call, bool stays) {
    failed = false;
    staysOut = stays;
    callsLeft = call;
}

FailingMemory::~FailingMemory() { callsLeft = 0; }

bool FailingMemory::hasFailed() const { return failed; }

} // namespace VLServiceTest

void* operator new(std::size_t size) {
    if (isRefused())
        throw std::bad_alloc();
    for (;;) {
        if (void* const block = std::malloc(size > 0 ? size : 1))
            return block;
        std::new_handler const handler = std::get_new_handler();
        if (!handler)
            throw std::bad_alloc();
        handler();
    }
}

/// A sanitizer's own would not fit to the releasing below.
void* operator new(std::size_t size, std::nothrow_t const&) noexcept {
    try {
        return operator new(size);
    } catch (std::bad_alloc const&) {
        return nullptr;
    }
}

void operator delete(void* block) noexcept { std::free(block); }
void operator delete(void* block, std::size_t) noexcept { std::free(block); }
