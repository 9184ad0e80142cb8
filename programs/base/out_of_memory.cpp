#include "programs/base/out_of_memory.h"

#include "programs/base/pending_file.h"

#include <cstdlib>
#include <cstring>
#include <new>

#include <unistd.h>

namespace Base {
namespace {

/// Enough to tell of a failure and to clean up behind it.
constexpr std::size_t ENOUGH_TO_GO_ON = std::size_t{1} << 16;

char const* lastLine = "there is not enough memory\n";

void endUnlessThereIsSome() {
    void* const probe = std::malloc(ENOUGH_TO_GO_ON);
    if (!probe)
        endOutOfMemory();
    std::free(probe);
    throw std::bad_alloc();
}

} // namespace

void endWhenOutOfMemory(char const* line) noexcept {
    lastLine = line;
    std::set_new_handler(endUnlessThereIsSome);
}

void endOutOfMemory() noexcept {
    removePendingFiles();
    // Should that fail, too, the status still tells it.
    ssize_t const ignored = ::write(STDERR_FILENO, lastLine, std::strlen(lastLine));
    static_cast<void>(ignored);
    ::_exit(EXIT_FAILURE);
}

} // namespace Base
