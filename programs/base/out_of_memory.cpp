#include "programs/base/out_of_memory.h"

#include "programs/base/library_memory.h"
#include "programs/base/pending_file.h"

#include <cstdlib>
#include <cstring>
#include <exception>
#include <new>

#include <unistd.h>

namespace Base {
namespace {

char const* lastLine = "there is not enough memory\n";

void endOrThrow() {
    endUnlessThereIsSome();
    throw std::bad_alloc();
}

std::terminate_handler otherwise = nullptr;

/// std::bad_alloc may come where nothing may be thrown.
[[noreturn]] void endOrTerminate() {
    try {
        if (std::current_exception())
            throw;
    } catch (std::bad_alloc const&) {
        endOutOfMemory();
    } catch (...) {
        // Whatever else it is, is told by who tells it anyway.
    }
    otherwise();
    std::abort();
}

} // namespace

void endWhenOutOfMemory(char const* line) noexcept {
    lastLine = line;
    std::set_new_handler(endOrThrow);
    otherwise = std::set_terminate(endOrTerminate);
    holdLibraryMemory({&std::malloc, &std::realloc});
}

void endUnlessThereIsSome() noexcept {
    void* const probe = std::malloc(ENOUGH_TO_GO_ON);
    if (!probe)
        endOutOfMemory();
    std::free(probe);
}

void endOutOfMemory() noexcept {
    removePendingFiles();
    // Should that fail, too, the status still tells it.
    ssize_t const ignored = ::write(STDERR_FILENO, lastLine, std::strlen(lastLine));
    static_cast<void>(ignored);
    ::_exit(EXIT_FAILURE);
}

} // namespace Base
