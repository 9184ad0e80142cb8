#pragma once
// Texts that a pattern fits, made from its outline and tried on the engine.

#include "programs/patterns/pattern.h"

#include <cstddef>
#include <string>
#include <vector>

namespace Patterns {

/// Texts that the pattern fits, simplest first, each once, no more than `count`; none when the outline finds
/// none.
std::vector<std::string> samplesOf(Pattern const& pattern, std::size_t count);

} // namespace Patterns
