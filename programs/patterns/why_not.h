#pragma once
// Why the expression of a preset does not fit a document's name.

#include <chrono>
#include <string>

namespace Patterns {

struct WhyNot {
    /// One sentence without its full stop.
    std::string words;
    /// The first part of the expression that does not fit, and what of the name the parts in front of it fit;
    /// both empty when that cannot be told.
    std::string failedPart;
    std::string fitted;
};

/// For an expression that compiles and does not fit the name. Takes little longer than `patience`, and then
/// says that it took too long.
WhyNot whyNot(std::string const& expression, std::string const& name,
              std::chrono::steady_clock::duration patience = std::chrono::seconds(1));

} // namespace Patterns
