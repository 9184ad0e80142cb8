#pragma once
// What the settings say of the mailings of one batch: asked of each letter, decided once for each pack
// preset.

#include "programs/policy/limits.h"
#include "programs/vlmail/letters/reading.h"

#include <map>
#include <optional>
#include <string>
#include <vector>

namespace VlMail {

class MailingPolicies {
public:
    /// `sendsNotices` is whether the service tells people of mailings, where that is known. Throws Error when
    /// the settings cannot be read.
    MailingPolicies(Policy::SourcedSettings settings, Policy::Moment moment,
                    std::optional<bool> sendsNotices = std::nullopt);

    /// Why the letter may not go out by that preset; empty when it may. `sheets` are those that it has on
    /// paper.
    std::string whyNot(long long sheets, Cfg::PackPreset const& packPreset);
    /// The pack preset as its mailing bears it.
    Cfg::PackPreset asAllowed(Cfg::PackPreset packPreset) const;
    /// That mailings go by; empty when there is none.
    std::string const& purchaseOrder() const { return rules_.purchaseOrder; }
    bool allows(long long sheets) const { return !Policy::refusalOfSheets(sheets, rules_); }

    // What a person should know; empty when there is nothing.

    /// Of a mailing by that preset.
    std::string noteOn(Cfg::PackPreset const& packPreset) const;
    /// Of those who are to be notified of letters.
    std::string noteOnNotifications() const;

private:
    std::string const& refusalOf(Cfg::PackPreset const& packPreset);

    Policy::SourcedSettings settings_;
    Policy::Moment moment_;
    Policy::Rules rules_;
    std::optional<bool> sendsNotices_;
    /// By the pack preset's name.
    std::map<std::string, std::string> refusals_;
};

} // namespace VlMail
