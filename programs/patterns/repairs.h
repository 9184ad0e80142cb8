#pragma once
// Changes of a pattern that would make it fit a text that it does not fit. They are candidates: whoever takes
// one has tried it.

#include "programs/patterns/parts.h"

#include <string>
#include <string_view>
#include <vector>

namespace Patterns {

/// The text as a pattern that fits it alone.
std::string escaped(std::string_view text);

/// Takes line breaks for blanks, and between the characters of what is repeated.
std::vector<std::string> withLineBreaks(std::string_view pattern);

/// With one of its groups as the value, or all of it; none when a group is the value already.
std::vector<std::string> withValueGroups(std::string_view pattern);

/// Takes the marks of typography in `text` beside the plain ones of the pattern.
std::vector<std::string> withLookAlikes(std::string_view plainPattern, std::string_view text);

/// With another text for a literal part; none when the pattern does not have it as it stands.
std::vector<std::string> withOtherLiteral(std::string_view pattern, std::string_view literal,
                                          std::string_view text);

/// The front of a pattern with the text that stands behind what it fits.
std::vector<std::string> withOtherRest(Cut const& cut, std::string_view behind);

} // namespace Patterns
