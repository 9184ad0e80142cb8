#pragma once
// Why the expression of a preset does not fit a document's name.

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

/// For an expression that compiles and does not fit the name.
WhyNot whyNot(std::string const& expression, std::string const& name);

} // namespace Patterns
