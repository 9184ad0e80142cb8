// What pack presets say about reading: whether it can be used, and goes together with the fields.
#include "programs/patterns/pattern.h"
#include "programs/reader/field_search.h"
#include "programs/reader/reading_rules.h"
#include "programs/vlmail/presets/checks.h"
#include "programs/vlmail/presets/nearest_name.h"
#include "programs/vlmail/presets/words.h"

#include <algorithm>
#include <array>
#include <string>
#include <vector>

namespace VlMail {
namespace {

using enum FindingKind;
using Reader::ReadingRules;

/// Of the zones that are read by this pack preset's rules.
std::vector<std::string> zoneNames(PresetsDocument const& document, std::string const& packPreset) {
    std::vector<std::string> names;
    for (ListedExtractPreset const& preset : document.extractPresets())
        if (preset.preset.packPresetName() == packPreset)
            for (ListedZone const& zone : preset.zones)
                names.push_back(zone.name);
    return names;
}

void checkZoneNames(PresetsDocument const& document, ListedPackPreset const& pack, ReadingRules const& rules,
                    Findings& findings) {
    std::vector<std::string> const names = zoneNames(document, pack.name);
    for (auto const& [name, zone] : rules.zones) {
        if (std::ranges::find(names, name) != names.end())
            continue;
        std::string const nearest = nearestName(name, names);
        findings.add(ReadingZoneMissing, pack.place / ReadingRules::KEY / "zones" / name,
                     {inQuotes(name), nearest.empty() ? "write the name of a zone, or remove it"
                                                      : "write " + inQuotes(nearest)});
    }
}

bool fits(std::string const& pattern, char const* text) {
    try {
        return Patterns::Pattern(pattern, Patterns::Pattern::Use::Validate).fits(text) ==
               Patterns::Pattern::Answer::Yes;
    } catch (Patterns::Broken const&) {
        return true; // told by checkPatterns
    }
}

/// Whether a field of its own pattern takes no number with decimals as "reading" hands them on.
bool refusesPlainDecimals(ListedField const& listed) {
    constexpr std::array NUMBERS{"1234.56", "234.56", "12.50", "2.5", "0.5"};
    std::string const pattern = listed.json.get("value_match").textOrEmpty();
    return !pattern.empty() &&
           std::ranges::none_of(NUMBERS, [&](char const* text) { return fits(pattern, text); });
}

} // namespace

ReadingRules readingRulesFor(PresetsDocument const& document, ListedExtractPreset const& preset) {
    std::vector<Reader::RulesFault> faults;
    auto const pack =
        std::ranges::find(document.packPresets(), preset.preset.packPresetName(), &ListedPackPreset::name);
    return pack == document.packPresets().end()
               ? ReadingRules()
               : ReadingRules::from(pack->json.get(ReadingRules::KEY), faults);
}

void checkReadingRules(PresetsDocument const& document, Findings& findings) {
    for (ListedPackPreset const& pack : document.packPresets()) {
        std::vector<Reader::RulesFault> faults;
        ReadingRules const rules = ReadingRules::from(pack.json.get(ReadingRules::KEY), faults);
        for (Reader::RulesFault const& fault : faults)
            findings.add(ReadingRefused, pack.place / ReadingRules::KEY / fault.path,
                         {fault.what, fault.advice});
        checkZoneNames(document, pack, rules, findings);
    }
}

void checkReadingOfFields(PresetsDocument const& document, Findings& findings) {
    forEachField(document, [&](ListedExtractPreset const& preset, ListedZone const& zone,
                               ListedField const& listed) {
        if (listed.field && Reader::separatesLetters(*listed.field) &&
            !readingRulesFor(document, preset).isOnFirstPage(zone.name))
            findings.add(ReadingMarkElsewhere, listed.place / "mark", {inQuotes(zone.name)});
        bool const isReal = listed.field && listed.field->validation().valueType() == FieldValueType::Float;
        if (isReal && readingRulesFor(document, preset).numbers.kind != Reader::NumberRules::Decimal::Plain &&
            refusesPlainDecimals(listed))
            findings.add(ReadingAgainstMatch, listed.place / "value_match");
    });
}

} // namespace VlMail
