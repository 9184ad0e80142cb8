#pragma once
// The checks of settings. Each looks at the whole document and adds what it finds; none depends on another.

#include "programs/reader/reading_rules.h"
#include "programs/vlmail/presets/finding.h"
#include "programs/vlmail/presets/presets_document.h"

namespace VlMail {

using Check = void (*)(PresetsDocument const&, Findings&);

// check_keys.cpp
void checkParts(PresetsDocument const& document, Findings& findings);
void checkDuplicateKeys(PresetsDocument const& document, Findings& findings);
void checkKeys(PresetsDocument const& document, Findings& findings);
void checkNumbers(PresetsDocument const& document, Findings& findings);

// check_reach.cpp: which extraction preset a document gets to.
void checkMatches(PresetsDocument const& document, Findings& findings);
void checkReach(PresetsDocument const& document, Findings& findings);
void checkOrders(PresetsDocument const& document, Findings& findings);
void checkErasedPresets(PresetsDocument const& document, Findings& findings);

// check_packs.cpp
void checkPackPresetNames(PresetsDocument const& document, Findings& findings);
void checkPackPresetsUsed(PresetsDocument const& document, Findings& findings);
void checkProcessModes(PresetsDocument const& document, Findings& findings);
void checkDelays(PresetsDocument const& document, Findings& findings);
void checkEmails(PresetsDocument const& document, Findings& findings);
void checkLetterheads(PresetsDocument const& document, Findings& findings);

// check_patterns.cpp
void checkPatterns(PresetsDocument const& document, Findings& findings);
void checkValueGroups(PresetsDocument const& document, Findings& findings);

// check_zones.cpp
void checkZonePlaces(PresetsDocument const& document, Findings& findings);
void checkZonesApart(PresetsDocument const& document, Findings& findings);
void checkZoneFields(PresetsDocument const& document, Findings& findings);

// check_fields.cpp
void checkFieldsCoexist(PresetsDocument const& document, Findings& findings);
void checkAddresses(PresetsDocument const& document, Findings& findings);
void checkFieldAttributes(PresetsDocument const& document, Findings& findings);

// check_values.cpp
void checkLimits(PresetsDocument const& document, Findings& findings);
void checkDefaults(PresetsDocument const& document, Findings& findings);
void checkDatesWithoutYear(PresetsDocument const& document, Findings& findings);
void checkNumbersWithoutMinimum(PresetsDocument const& document, Findings& findings);
void checkDecimalCommas(PresetsDocument const& document, Findings& findings);

// check_reading.cpp
void checkReadingRules(PresetsDocument const& document, Findings& findings);
void checkReadingOfFields(PresetsDocument const& document, Findings& findings);
/// How the documents that get this preset are read; what is wrong there counts as not said.
Reader::ReadingRules readingRulesFor(PresetsDocument const& document, ListedExtractPreset const& preset);

// check_production.cpp
void checkProductionRules(PresetsDocument const& document, Findings& findings);
void checkPrintArea(PresetsDocument const& document, Findings& findings);

/// Calls `look` with each preset, zone and field.
template<typename Look>
void forEachField(PresetsDocument const& document, Look look) {
    for (ListedExtractPreset const& preset : document.extractPresets())
        for (ListedZone const& zone : preset.zones)
            for (ListedField const& field : zone.fields)
                look(preset, zone, field);
}

/// The same with the fields that can be read.
template<typename Look>
void forEachReadableField(PresetsDocument const& document, Look look) {
    forEachField(document, [&](ListedExtractPreset const&, ListedZone const&, ListedField const& field) {
        if (field.field)
            look(field, *field.field);
    });
}

} // namespace VlMail
