#pragma once
// Looks a settings document over for what would go wrong with it, or go another way than was meant.

#include "programs/vlmail/presets/finding.h"
#include "programs/vlmail/presets/presets_document.h"

#include <vector>

namespace VlMail {

/// Errors first, each group in the order of the document.
std::vector<Finding> lint(PresetsDocument const& document);

} // namespace VlMail
