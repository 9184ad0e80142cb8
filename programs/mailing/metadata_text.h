#pragma once
// Metadata of a mailing as text, for whoever reads a part of it: no tree of all letters is built, which takes
// many times the memory and the time of their text.

#include "vlservice/pack/shared_mem_buffer.h"

namespace Mailing {

/// Throws Error.
[[noreturn]] void failAsMetadata();

/// The JSON text in a container's blob. Throws Error when it cannot be expanded and for more than 256 MiB.
SharedMemBuffer expandedMetadata(SharedMemBuffer blob);

/// A key has to be there once; any other way to spell it is none of ours. Throws Error.
void takeOnce(bool& isTaken);

} // namespace Mailing
