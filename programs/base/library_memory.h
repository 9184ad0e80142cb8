#pragma once
// Where libraries get their memory that do not look whether they got it: without some small pieces, that for
// Unicode crashes or waits for itself, and that for JSON leaves values out.

#include <cstddef>

namespace Base {

/// As std::malloc and std::realloc.
struct MemorySource {
    void* (*allocate)(std::size_t size);
    void* (*reallocate)(void* block, std::size_t size);
};

/// From here on those libraries get what they ask for from there: where a piece of up to ENOUGH_TO_GO_ON is
/// not to be had at the second try either, the process ends as endOutOfMemory() does. What it gives is
/// released by std::free(). To be called before anything of the library for Unicode is.
void holdLibraryMemory(MemorySource source) noexcept;

} // namespace Base
