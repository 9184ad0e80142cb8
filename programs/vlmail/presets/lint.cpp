#include "programs/vlmail/presets/lint.h"

#include "programs/vlmail/presets/checks.h"

namespace VlMail {
namespace {

constexpr Check CHECKS[] = {
    checkParts,
    checkDuplicateKeys,
    checkKeys,
    checkNumbers,
    checkMatches,
    checkReach,
    checkOrders,
    checkErasedPresets,
    checkPackPresetNames,
    checkPackPresetsUsed,
    checkProcessModes,
    checkLetterheads,
    checkDelays,
    checkEmails,
    checkPatterns,
    checkValueGroups,
    checkZonePlaces,
    checkZonesApart,
    checkZoneFields,
    checkFieldsCoexist,
    checkAddresses,
    checkFieldAttributes,
    checkLimits,
    checkDefaults,
    checkDatesWithoutYear,
    checkNumbersWithoutMinimum,
    checkDecimalCommas,
    checkReadingRules,
    checkReadingOfFields,
    checkProductionRules,
    checkPrintArea,
};

} // namespace

std::vector<Finding> lint(PresetsDocument const& document) {
    Findings findings;
    for (Check const check : CHECKS)
        check(document, findings);
    return findings.sorted();
}

} // namespace VlMail
