#include "programs/vlmail/mailings/mailing_policies.h"

#include "programs/base/error.h"
#include "programs/base/quoting.h"

#include <utility>

namespace VlMail {
namespace {

Policy::Rules rulesOf(Policy::SourcedSettings const& settings) {
    try {
        return Policy::Rules(settings);
    } catch (std::exception const& wrong) {
        throw Base::Error(std::string("cannot use the settings: ") + wrong.what() + "; correct them there");
    }
}

} // namespace

MailingPolicies::MailingPolicies(Policy::SourcedSettings settings, Policy::Moment moment)
    : settings_(std::move(settings)), moment_(std::move(moment)), rules_(rulesOf(settings_)) {}

std::string MailingPolicies::whyNot(long long sheets, Cfg::PackPreset const& packPreset) {
    std::string why = refusalOf(packPreset);
    if (auto const refusal = Policy::refusalOfSheets(sheets, rules_))
        why += (why.empty() ? "" : "; ") + refusal->line();
    return why;
}

Cfg::PackPreset MailingPolicies::asAllowed(Cfg::PackPreset packPreset) const {
    packPreset.setPriorityDelivery(Policy::goesWithPriority(packPreset, rules_));
    return packPreset;
}

std::string const& MailingPolicies::refusalOf(Cfg::PackPreset const& packPreset) {
    auto const known = refusals_.find(packPreset.name());
    if (known != refusals_.end())
        return known->second;
    auto const sourceOf = [this](std::string const& name) { return settings_.sourceOfPackPreset(name); };
    std::string line = Policy::inOneLine(Policy::refusalsOf(packPreset, rules_, moment_, sourceOf));
    return refusals_.emplace(packPreset.name(), std::move(line)).first->second;
}

std::string noteOn(Cfg::PackPreset const& packPreset) {
    if (!packPreset.confirmReceipt())
        return {};
    return "pack preset " + Base::inQuotes(packPreset.name()) +
           " wants an e-mail when its mailing is handed over, which nobody sends: carriers take "
           "letters alone";
}

} // namespace VlMail
