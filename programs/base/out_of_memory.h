#pragma once
// What a program does when there is no memory left: telling of it takes some, and so does going on.

namespace Base {

/// From here on the process ends as endOutOfMemory() does when operator new finds no memory at all. A request
/// that alone is too large is std::bad_alloc as ever. `line` must live as long as the process.
void endWhenOutOfMemory(char const* line) noexcept;

/// Removes the pending files of a program that does so on signals, writes the line and ends the process with
/// status 1, all without taking memory and without destroying anything. For what has lost a step to
/// std::bad_alloc and cannot make it up.
[[noreturn]] void endOutOfMemory() noexcept;

} // namespace Base
