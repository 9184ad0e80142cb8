#pragma once
// Makes texts that pieces of a pattern fit, one way of many at a time.

#include "programs/patterns/outline.h"

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace Patterns {

/// Numbers that look random and are the same everywhere.
class Choices {
public:
    explicit Choices(std::uint64_t variant) : variant_(variant), state_(variant * 0x9E3779B97F4A7C15) {}

    /// Below `count`. The first variants are plain: always the first choice, then always the second.
    std::size_t pick(std::size_t count);

private:
    std::uint64_t variant_;
    std::uint64_t state_;
};

/// Gives nothing for what the outline does not look into.
class Sampler {
public:
    std::optional<std::string> sequence(Sequence const& pieces, Choices& choices);
    /// The piece without its repetition.
    std::optional<std::string> once(Piece const& piece, Choices& choices);

private:
    std::optional<std::string> repeated(Piece const& piece, Choices& choices);
    /// Some characters that a class has.
    std::vector<std::string> const& membersOf(std::string const& characterClass);

    std::map<std::string, std::vector<std::string>> members_;
};

void addUnique(std::vector<std::string>& texts, std::string text);

} // namespace Patterns
