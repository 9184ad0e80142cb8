#include "programs/policy/limits.h"

#include "programs/base/email_address.h"
#include "programs/base/plain_text.h"
#include "programs/base/quoting.h"
#include "programs/base/utf8.h"
#include "vlservice/cfg/departments.h"
#include "vlservice/cfg/po.h"
#include "vlservice/cfg/profiles.h"
#include "vlservice/platform/local_time.h"

#include <algorithm>
#include <iterator>
#include <string_view>

namespace Policy {
namespace {

struct LimitName {
    Limit limit;
    char const* code;
};

constexpr LimitName NAMES[] = {
    {Limit::TooManySheets, "too-many-sheets"},
    {Limit::DepartmentNotListed, "department-not-listed"},
    {Limit::ProfileNotListed, "profile-not-listed"},
    {Limit::PurchaseOrderMissing, "purchase-order-missing"},
    {Limit::PurchaseOrderExpired, "purchase-order-expired"},
    {Limit::EmailMalformed, "email-malformed"},
    {Limit::DelayImpossible, "delay-impossible"},
};

constexpr Cfg::PriorityDelivery NEVER{1};
constexpr Cfg::PriorityDelivery ALWAYS{2};

/// A text from settings within a line for people.
std::string shown(std::string const& text) {
    constexpr std::size_t MAX_BYTES = 80;
    std::string const line = Base::plainLine(text);
    std::string_view const front = Base::firstBytes(line, MAX_BYTES);
    return Base::inQuotes(front.size() == line.size() ? line : std::string(front) + "...");
}

/// The first few of a list, and how many more there are.
std::string shownList(std::vector<std::string> const& names) {
    constexpr std::size_t MOST = 5;
    std::string list;
    for (std::size_t i = 0; i < std::min(names.size(), MOST); ++i)
        list += (i == 0 ? "" : ", ") + shown(names[i]);
    if (names.size() > MOST)
        list += " and " + std::to_string(names.size() - MOST) + " more";
    return names.empty() ? "none" : list;
}

std::optional<Refusal> refusalOfChoice(Limit limit, char const* noun, std::string const& chosen,
                                       std::vector<std::string> const& listed,
                                       Sourced<bool> const& enforced) {
    if (!enforced.value || std::ranges::find(listed, chosen) != listed.end())
        return std::nullopt;
    std::string const value = chosen.empty() ? std::string("no ") + noun : noun + (' ' + shown(chosen));
    return Refusal{limit, value + ", " + shownList(listed) + " allowed by " + enforced.source};
}

std::optional<Refusal> refusalOfPurchaseOrder(Rules const& rules, long long now) {
    if (!rules.enforcesPurchaseOrder.value)
        return std::nullopt;
    if (rules.purchaseOrder.empty())
        return Refusal{Limit::PurchaseOrderMissing,
                       "no purchase order, one wanted by " + rules.enforcesPurchaseOrder.source};
    if (rules.expiry.value == 0 || now < rules.expiry.value)
        return std::nullopt;
    return Refusal{Limit::PurchaseOrderExpired, "purchase order " + shown(rules.purchaseOrder) +
                                                    ", valid until " + LocalTime::toText(rules.expiry.value) +
                                                    " as set by " + rules.expiry.source};
}

std::optional<Refusal> refusalOfEmail(Cfg::PackPreset const& mailing, PresetSource const& sourceOf) {
    std::string const& email = mailing.userEmailOverride();
    if (email.empty() || Base::isEmailAddress(email))
        return std::nullopt;
    return Refusal{Limit::EmailMalformed, "\"customer_email\" " + shown(email) +
                                              ", one address NAME@HOST possible, as set by " +
                                              sourceOf(mailing.name())};
}

std::optional<Refusal> refusalOfDelay(Cfg::PackPreset const& mailing, Moment const& moment,
                                      PresetSource const& sourceOf) {
    std::string const why =
        mailing.pDelayInfo() ? whyImpossible(*mailing.pDelayInfo(), moment) : std::string();
    if (why.empty())
        return std::nullopt;
    return Refusal{Limit::DelayImpossible, why + ", as set by " + sourceOf(mailing.name())};
}

template<typename Elements>
std::vector<std::string> namesOf(Elements const& elements) {
    std::vector<std::string> names;
    for (auto const& element : elements)
        names.push_back(element.name());
    return names;
}

/// The profiles' names: elements that are inherited one by one.
std::vector<std::string> namesOf(Cfg::Profiles const& profiles) {
    std::vector<std::string> names;
    for (auto const& element : profiles.elements<Cfg::ProfFieldIdxs::Vals>())
        names.push_back(element.value.name());
    return names;
}

/// A value of the part "app".
template<Cfg::AppFieldIdxs I>
auto ofApp(Cfg::App const& app, SourcedSettings const& settings, char const* key) {
    using Value = std::decay_t<decltype(app.value<I>())>;
    return Sourced<Value>{app.value<I>(), settings.sourceOf(Cfg::App::PART_NAME, key)};
}

} // namespace

char const* codeOf(Limit limit) { return std::ranges::find(NAMES, limit, &LimitName::limit)->code; }

std::string Refusal::line() const { return codeOf(limit) + (": " + says); }

std::string inOneLine(std::vector<Refusal> const& refusals) {
    std::string line;
    for (Refusal const& refusal : refusals)
        line += (line.empty() ? "" : "; ") + refusal.line();
    return line;
}

Rules::Rules(SourcedSettings const& settings) {
    using enum Cfg::AppFieldIdxs;
    auto const app = settings.part<Cfg::App>();
    maxLetterSheets = ofApp<MaxLetterSheets>(app, settings, "max_letter_sheets");
    priority = app.value<PriorityDelivery>();
    enforcesDepartment = ofApp<EnforceDep>(app, settings, "enfoce_dep");
    enforcesProfile = ofApp<EnforceProfile>(app, settings, "enforce_profile");
    enforcesPurchaseOrder = ofApp<EnforcePo>(app, settings, "enforce_po");
    departments = namesOf(settings.part<Cfg::Departments>().value<Cfg::DepFieldIdxs::Vals>());
    profiles = namesOf(settings.part<Cfg::Profiles>());
    auto const order = settings.part<Cfg::PO>();
    purchaseOrder = order.value<Cfg::POFieldIdxs::Code>();
    expiry = {order.value<Cfg::POFieldIdxs::Expiry>(), settings.sourceOf(Cfg::PO::PART_NAME, "expiry")};
}

std::vector<std::string> Rules::parts() {
    return {Cfg::App::PART_NAME, Cfg::Departments::PART_NAME, Cfg::Profiles::PART_NAME, Cfg::PO::PART_NAME};
}

std::optional<Refusal> refusalOfSheets(long long sheets, Rules const& rules) {
    auto const& [most, source] = rules.maxLetterSheets;
    if (most <= 0 || sheets <= most)
        return std::nullopt;
    return Refusal{Limit::TooManySheets,
                   std::to_string(sheets) + " sheets, " + std::to_string(most) + " allowed by " + source};
}

std::vector<Refusal> refusalsOf(Cfg::PackPreset const& mailing, Rules const& rules, Moment const& moment,
                                PresetSource const& sourceOf) {
    std::optional<Refusal> const checks[] = {
        refusalOfChoice(Limit::DepartmentNotListed, "department", mailing.department(), rules.departments,
                        rules.enforcesDepartment),
        refusalOfChoice(Limit::ProfileNotListed, "profile", mailing.profile(), rules.profiles,
                        rules.enforcesProfile),
        refusalOfPurchaseOrder(rules, moment.now),
        refusalOfEmail(mailing, sourceOf),
        refusalOfDelay(mailing, moment, sourceOf),
    };
    std::vector<Refusal> refusals;
    for (std::optional<Refusal> const& check : checks)
        if (check)
            refusals.push_back(*check);
    return refusals;
}

bool goesWithPriority(Cfg::PackPreset const& mailing, Rules const& rules) {
    return rules.priority == ALWAYS || (rules.priority != NEVER && mailing.priorityDelivery());
}

json::Object decidedMembers(Rules const& rules) {
    json::Object members;
    if (!rules.purchaseOrder.empty())
        members.set(Mailing::PURCHASE_ORDER_KEY, rules.purchaseOrder);
    if (rules.priority == NEVER || rules.priority == ALWAYS)
        members.set("priority_delivery", rules.priority == ALWAYS);
    return members;
}

} // namespace Policy
