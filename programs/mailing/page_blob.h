#pragma once
// Pages and metadata as containers and databases hold them.

#include "vlservice/pack/shared_mem_buffer.h"

#include <string_view>

namespace Mailing {

/// The data, compressed. Throws Error when there is no memory for it.
SharedMemBuffer compressed(std::string_view data);

/// The data of a blob. Throws Error when it cannot be expanded, or nothing is in it: neither a page nor
/// metadata is ever empty.
SharedMemBuffer expanded(SharedMemBuffer blob);

/// What is in a buffer, as long as that lives.
std::string_view viewOf(SharedMemBuffer const& data);

} // namespace Mailing
