#pragma once
// Lines that show how hard a pattern can work.

#include "programs/patterns/pattern.h"

#include <cstddef>
#include <string>
#include <vector>

namespace Patterns {

/// Lines of `length` characters that make a pattern try as many ways as it has: long runs of what its
/// repetitions take, behind what stands in front of them, with an end that fits nothing.
std::vector<std::string> hardLinesFor(Pattern const& pattern, std::size_t length);

} // namespace Patterns
