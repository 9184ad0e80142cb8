#pragma once
// What a pattern is made of, as far as advice about it needs to know. The engine decides what a pattern
// means: everything that comes from here is tried on it, or looked up in the letter.

#include <string>
#include <string_view>
#include <vector>

namespace Patterns {

/// Texts that must stand in every text that the pattern fits, without blanks at their ends, the longest
/// first; none for a pattern of alternatives.
std::vector<std::string> literalsOf(std::string_view pattern);

/// The pattern cut into two, at every place between its steps, the longest front first.
struct Cut {
    std::string front;
    std::string rest;
};
std::vector<Cut> cutsOf(std::string_view pattern);

/// A pattern without "^" at its front and "$" at its end, and these where it has them.
struct Anchors {
    std::string front;
    std::string core;
    std::string end;
};
Anchors anchorsOf(std::string_view pattern);

/// The pattern with each run of blanks as any number of them.
std::string withAnyBlanks(std::string_view pattern);

/// What of the pattern stands in front of its value; nothing when that cannot be told.
std::string labelIn(std::string_view pattern);

/// The pattern with all that it matches for its value.
std::string withWholeAsValue(std::string_view pattern);

bool hasValueGroup(std::string_view pattern);

} // namespace Patterns
