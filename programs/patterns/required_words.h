#pragma once
// What must stand in a text that a pattern fits, for finding the few of many patterns that may fit it.

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace Patterns {

/// For each alternative of the pattern the runs of ASCII letters and digits, in lower case, that stand in
/// every text which it fits without regard to case; of other characters letter case has odd partners. Nothing
/// for a pattern that is not understood in full: that may not compile, may be too complex for a name of 200
/// bytes, or may mean more than its outline shows.
std::optional<std::vector<std::vector<std::string>>> requiredWords(std::string_view pattern);

} // namespace Patterns
