#pragma once
// The outline of a pattern in Perl syntax: its pieces in order, and texts that it fits. It is made for
// advice: the engine decides what a pattern means, and everything that comes from here is tried on the engine
// first.

#include "programs/patterns/pattern.h"

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace Patterns {

/// One step of a pattern with its repetition, such as "Invoice", "\d+" or "(\.pdf)?".
struct PatternPiece {
    static constexpr std::size_t NO_LIMIT = static_cast<std::size_t>(-1);

    enum class Kind {
        Literal,   ///< one character
        Class,     ///< any of some characters
        Group,     ///< alternatives, each a sequence
        Assertion, ///< fits between characters
        Other,     ///< something that the outline does not look into
    };

    Kind kind = Kind::Other;
    /// The piece as it stands in the pattern, and the same without its repetition.
    std::string text;
    std::string body;
    /// The character of a literal.
    std::string literal;
    /// Of a group that has one.
    std::string groupName;
    std::vector<std::vector<PatternPiece>> alternatives;
    /// How often it may stand in a row.
    std::size_t least = 1;
    std::size_t most = 1;
};

using PatternSequence = std::vector<PatternPiece>;

/// The alternatives of a whole pattern; one for a pattern without "|" outside its groups. A malformed pattern
/// gives what can be told of it.
std::vector<PatternSequence> outlineOf(std::string_view pattern);

/// Whether a part of it may stand in a row more than once.
bool hasRepetition(std::vector<PatternSequence> const& outline);

/// Joins neighbouring literals, as people read them.
PatternSequence withJoinedLiterals(PatternSequence const& pieces);

/// The first group of that name, null when there is none.
PatternPiece const* findGroup(std::vector<PatternSequence> const& outline, std::string const& name);

/// Texts that the pattern fits, simplest first, each once, no more than `count`; none when the outline finds
/// none.
std::vector<std::string> samplesOf(Pattern const& pattern, std::size_t count);

/// Lines of `length` characters that make a pattern try as many ways as it has: long runs of what its
/// repetitions take, behind what stands in front of them, with an end that fits nothing.
std::vector<std::string> hardLinesFor(Pattern const& pattern, std::size_t length);

} // namespace Patterns
