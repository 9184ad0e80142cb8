#pragma once
// The search for a document's presets, step by step: which were tried, and why each did or did not fit.

#include "programs/patterns/why_not.h"
#include "programs/reader/pattern_time.h"
#include "programs/vlmail/letters/preset_index.h"
#include "vlservice/presets/presets.h"

#include <chrono>
#include <string>
#include <utility>
#include <vector>

namespace VlMail {

/// Tries presets on a document's name, and tells why they do not fit. Either has `time` in all.
class NameTrial {
public:
    explicit NameTrial(std::string name, std::chrono::milliseconds time = NAME_PATTERNS_TIME)
        : name_(std::move(name)), matching_({time, time}), explaining_({time, time}) {}

    /// Throws what ExtractPreset::match() does, which includes that the time is up.
    bool fits(Cfg::ExtractPreset const& preset);
    Patterns::WhyNot whyNot(std::string const& pattern);
    /// The same, with what normalisation would change.
    std::string whyNotInWords(std::string const& pattern);

private:
    std::string name_;
    Reader::PatternTime matching_;
    Reader::PatternTime explaining_;
};

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
std::vector<PresetStep> walkPresets(Cfg::Presets const& presets, std::string const& document,
                                    std::chrono::milliseconds time = NAME_PATTERNS_TIME);

} // namespace VlMail
