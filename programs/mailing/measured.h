#pragma once
// Texts in what digests are computed of.

#include <string>

namespace Mailing {

/// With its length in front no text runs into the next.
inline std::string measured(std::string const& text) { return std::to_string(text.size()) + ':' + text; }

} // namespace Mailing
