#pragma once
// The search for a document's presets, step by step: which were tried, and why each did or did not fit.

#include "vlservice/presets/presets.h"

#include <string>
#include <vector>

namespace VlMail {

struct PresetStep {
    enum class Answer { No, Yes, Failed };

    Cfg::ExtractPreset const* preset = nullptr;
    bool isInherited = false;
    Answer answer = Answer::No;
    /// In words, with what would make it fit where that can be told.
    std::string why;
};

/// The extraction presets in the order in which the document's name meets them, up to the one that decides:
/// the last step is the preset that fits or that fails. The steps point into the part.
std::vector<PresetStep> walkPresets(Cfg::Presets const& presets, std::string const& document);

} // namespace VlMail
