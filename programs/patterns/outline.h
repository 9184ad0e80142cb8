#pragma once
// The outline of a pattern in Perl syntax: its pieces in order. It is made for advice: the engine decides
// what a pattern means, and everything that comes from here is tried on the engine first.

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace Patterns {

/// One step of a pattern with its repetition, such as "Invoice", "\d+" or "(\.pdf)?".
struct Piece {
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
    std::vector<std::vector<Piece>> alternatives;
    /// How often it may stand in a row.
    std::size_t least = 1;
    std::size_t most = 1;
};

using Sequence = std::vector<Piece>;

/// The alternatives of a whole pattern; one for a pattern without "|" outside its groups. A malformed pattern
/// gives what can be told of it.
std::vector<Sequence> outlineOf(std::string_view pattern);

/// Whether a part of it may stand in a row more than once.
bool hasRepetition(std::vector<Sequence> const& outline);

/// Joins neighbouring literals, as people read them.
Sequence withJoinedLiterals(Sequence const& pieces);

/// The first group of that name, null when there is none.
Piece const* findGroup(std::vector<Sequence> const& outline, std::string const& name);

} // namespace Patterns
