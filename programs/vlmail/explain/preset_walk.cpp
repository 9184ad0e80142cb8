#include "programs/vlmail/explain/preset_walk.h"

#include "programs/patterns/text_forms.h"

namespace VlMail {
namespace {

using Cfg::ExtractPreset;
using Patterns::composed;
using Answer = PresetStep::Answer;
using Reader::PatternTime;

bool fits(std::string const& pattern, std::string const& name) {
    try {
        return ExtractPreset::match(pattern, name);
    } catch (std::exception const&) {
        return false;
    }
}

bool fitsComposed(std::string const& pattern, std::string const& name) {
    std::string const composedPattern = composed(pattern);
    std::string const composedName = composed(name);
    bool const changes = composedPattern != pattern || composedName != name;
    return changes && fits(composedPattern, composedName);
}

PresetStep take(Cfg::ArrValue<ExtractPreset> const& element, NameTrial& trial) {
    PresetStep step{&element.value, element.inh, Answer::No, {}};
    try {
        step.answer = trial.fits(element.value) ? Answer::Yes : Answer::No;
        step.why = step.answer == Answer::Yes ? "fits the whole name"
                                              : trial.whyNotInWords(element.value.strRegex());
    } catch (std::exception const& failure) {
        step.answer = Answer::Failed;
        step.why = std::string("cannot be tried: ") + failure.what();
    }
    return step;
}

} // namespace

bool NameTrial::fits(ExtractPreset const& preset) {
    PatternTime::Turn const turn(matching_);
    return preset.match(name_);
}

Patterns::WhyNot NameTrial::whyNot(std::string const& pattern) {
    PatternTime::Turn const turn(explaining_);
    return Patterns::whyNot(pattern, name_, explaining_.left());
}

std::string NameTrial::whyNotInWords(std::string const& pattern) {
    {
        PatternTime::Turn const turn(explaining_);
        if (fitsComposed(pattern, name_))
            return "would fit after Unicode normalisation: letters are composed in one and decomposed in the "
                   "other";
    }
    return whyNot(pattern).words;
}

std::vector<PresetStep> walkPresets(Cfg::Presets const& presets, std::string const& document,
                                    std::chrono::milliseconds time) {
    NameTrial trial(document, time);
    std::vector<PresetStep> steps;
    for (auto const& element : presets.elements<Cfg::PresetFieldIdxs::ExtractPresets>()) {
        steps.push_back(take(element, trial));
        if (steps.back().answer != Answer::No)
            break;
    }
    return steps;
}

} // namespace VlMail
