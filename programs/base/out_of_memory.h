#pragma once
// What a program does when there is no memory left: telling of it takes some, and so does going on.

#include <cstddef>

namespace Base {

/// In bytes: what it takes to tell of a failure and to clean up behind it.
constexpr std::size_t ENOUGH_TO_GO_ON = std::size_t{1} << 16;

/// From here on the process ends as endOutOfMemory() does when operator new, or a library of those in
/// library_memory.h, finds no memory at all, and when std::bad_alloc comes where nothing may be thrown. A
/// request that alone is too large fails as ever. `line` must live as long as the process. To be called
/// before anything of the library for Unicode is.
void endWhenOutOfMemory(char const* line) noexcept;

/// Ends the process as endOutOfMemory() does where there is no memory to go on with.
void endUnlessThereIsSome() noexcept;

/// Removes the pending files of a program that does so on signals, writes the line and ends the process with
/// status 1, all without taking memory and without destroying anything. For what has lost a step to
/// std::bad_alloc and cannot make it up.
[[noreturn]] void endOutOfMemory() noexcept;

} // namespace Base
