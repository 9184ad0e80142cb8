#include "programs/vlmail/explain/preset_walk.h"

#include "programs/patterns/text_forms.h"
#include "programs/patterns/why_not.h"

namespace VlMail {
namespace {

using Cfg::ExtractPreset;
using Patterns::composed;
using Answer = PresetStep::Answer;

bool fits(std::string const& pattern, std::string const& name) {
    try {
        return ExtractPreset::match(pattern, name);
    } catch (std::exception const&) {
        return false;
    }
}

std::string wordsWhyNot(std::string const& pattern, std::string const& name) {
    std::string const composedPattern = composed(pattern);
    std::string const composedName = composed(name);
    bool const changes = composedPattern != pattern || composedName != name;
    if (changes && fits(composedPattern, composedName))
        return "would fit after Unicode normalisation: letters are composed in one and decomposed in the "
               "other";
    return Patterns::whyNot(pattern, name).words;
}

PresetStep take(Cfg::ArrValue<ExtractPreset> const& element, std::string const& document) {
    PresetStep step{&element.value, element.inh, Answer::No, {}};
    try {
        step.answer = element.value.match(document) ? Answer::Yes : Answer::No;
        step.why = step.answer == Answer::Yes ? "fits the whole name"
                                              : wordsWhyNot(element.value.strRegex(), document);
    } catch (std::exception const& failure) {
        step.answer = Answer::Failed;
        step.why = std::string("cannot be tried: ") + failure.what();
    }
    return step;
}

} // namespace

std::vector<PresetStep> walkPresets(Cfg::Presets const& presets, std::string const& document) {
    std::vector<PresetStep> steps;
    for (auto const& element : presets.elements<Cfg::PresetFieldIdxs::ExtractPresets>()) {
        steps.push_back(take(element, document));
        if (steps.back().answer != Answer::No)
            break;
    }
    return steps;
}

} // namespace VlMail
