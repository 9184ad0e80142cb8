#include "programs/vlmail/mailings/mailing_policies.h"

#include "programs/base/error.h"
#include "programs/base/quoting.h"

#include <utility>

namespace VlMail {
namespace {

constexpr char const* NOBODY_SENDS = "nobody sends: the service has no carrier \"email\" of the type smtp";

Policy::Rules rulesOf(Policy::SourcedSettings const& settings) {
    try {
        return Policy::Rules(settings);
    } catch (std::exception const& wrong) {
        throw Base::Error(Base::Code::SettingsMalformed,
                          std::string("cannot use the settings: ") + wrong.what() + "; correct them there");
    }
}

} // namespace

MailingPolicies::MailingPolicies(Policy::SourcedSettings settings, Policy::Moment moment,
                                 std::optional<bool> sendsNotices)
    : settings_(std::move(settings)), moment_(std::move(moment)), rules_(rulesOf(settings_)),
      sendsNotices_(sendsNotices) {}

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

std::string MailingPolicies::noteOn(Cfg::PackPreset const& packPreset) const {
    if (!packPreset.confirmReceipt())
        return {};
    std::string const wanted = "pack preset " + Base::inQuotes(packPreset.name()) +
                               " wants an e-mail when its mailing is handed over, which ";
    if (packPreset.userEmailOverride().empty())
        return wanted + "nobody gets: it has no \"customer_email\"";
    if (sendsNotices_)
        return *sendsNotices_ ? "" : wanted + NOBODY_SENDS;
    return wanted + "a service sends that has a carrier of e-mail";
}

std::string MailingPolicies::noteOnNotifications() const {
    return sendsNotices_.value_or(true)
               ? ""
               : std::string("who is to be notified gets an e-mail, which ") + NOBODY_SENDS;
}

} // namespace VlMail
