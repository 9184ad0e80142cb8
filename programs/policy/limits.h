#pragma once
// What the settings of a node allow of a mailing and of its letters.

#include "programs/mailing/metadata.h"
#include "programs/policy/slots.h"
#include "programs/policy/sourced_settings.h"
#include "vlservice/cfg/app.h"
#include "vlservice/presets/pack_preset.h"

#include <functional>
#include <optional>
#include <string>
#include <vector>

namespace Policy {

/// What is refused; each has a stable name.
enum class Limit {
    TooManySheets,
    DepartmentNotListed,
    ProfileNotListed,
    PurchaseOrderMissing,
    PurchaseOrderExpired,
    EmailMalformed,
    DelayImpossible,
};

/// "too-many-sheets".
char const* codeOf(Limit limit);

struct Refusal {
    Limit limit;
    /// The value, what is allowed, and who says so: "31 sheets, 5 allowed by u=bob/a=acme".
    std::string says;

    /// "too-many-sheets: 31 sheets, 5 allowed by u=bob/a=acme".
    std::string line() const;
};

/// The lines of refusals as one.
std::string inOneLine(std::vector<Refusal> const& refusals);

/// The values of a node's settings that decide.
struct Rules {
    /// Those of the built-in settings.
    Rules() : Rules(SourcedSettings()) {}
    /// Throws std::exception when a part cannot be read.
    explicit Rules(SourcedSettings const& settings);
    /// The names of the settings parts that they stand in.
    static std::vector<std::string> parts();

    /// 0 and below are no limit.
    Sourced<int> maxLetterSheets;
    Cfg::PriorityDelivery priority{};
    Sourced<bool> enforcesDepartment;
    std::vector<std::string> departments;
    Sourced<bool> enforcesProfile;
    std::vector<std::string> profiles;
    Sourced<bool> enforcesPurchaseOrder;
    std::string purchaseOrder;
    /// Seconds since the epoch; 0 never comes.
    Sourced<long long> expiry;
};

/// Nothing when a letter of so many sheets may go out.
std::optional<Refusal> refusalOfSheets(long long sheets, Rules const& rules);

/// Gives where the pack preset of that name comes from.
using PresetSource = std::function<std::string(std::string const& packPreset)>;

/// What is refused of a mailing whatever its letters are; none when they may go out.
std::vector<Refusal> refusalsOf(Cfg::PackPreset const& mailing, Rules const& rules, Moment const& moment,
                                PresetSource const& sourceOf);

/// Whether a mailing is delivered with priority: as its preset says unless the settings say never or always.
bool goesWithPriority(Cfg::PackPreset const& mailing, Rules const& rules);

/// The members of a mailing's metadata that the settings decide, with their values: its purchase order, and
/// whether it goes with priority where that is not the preset's affair.
json::Object decidedMembers(Rules const& rules);

} // namespace Policy
