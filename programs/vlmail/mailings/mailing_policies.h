#pragma once
// What the settings say of the mailings of one batch: asked of each letter, decided once for each pack
// preset.

#include "programs/policy/limits.h"
#include "programs/vlmail/letters/reading.h"

#include <map>
#include <string>
#include <vector>

namespace VlMail {

class MailingPolicies {
public:
    /// Throws Error when the settings cannot be read.
    MailingPolicies(Policy::SourcedSettings settings, Policy::Moment moment);

    /// Why the letter may not go out by that preset; empty when it may. `sheets` are those that it has on
    /// paper.
    std::string whyNot(long long sheets, Cfg::PackPreset const& packPreset);
    /// The pack preset as its mailing bears it.
    Cfg::PackPreset asAllowed(Cfg::PackPreset packPreset) const;
    /// That mailings go by; empty when there is none.
    std::string const& purchaseOrder() const { return rules_.purchaseOrder; }
    bool allows(long long sheets) const { return !Policy::refusalOfSheets(sheets, rules_); }

private:
    std::string const& refusalOf(Cfg::PackPreset const& packPreset);

    Policy::SourcedSettings settings_;
    Policy::Moment moment_;
    Policy::Rules rules_;
    /// By the pack preset's name.
    std::map<std::string, std::string> refusals_;
};

/// What a person should know of a mailing by that preset; empty when there is nothing.
std::string noteOn(Cfg::PackPreset const& packPreset);

} // namespace VlMail
