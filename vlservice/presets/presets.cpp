#include "vlservice/presets/presets.h"

#include "vlservice/extract/extract_field.h"
#include "vlservice/extract/extract_zones.h"

#include <algorithm>
#include <cstdint>
#include <memory>
#include <stdexcept>
#include <vector>

namespace Cfg {
namespace {

constexpr std::uint32_t CATCH_ALL_PROCESS_MODE = 3;

/// The preset of the first element that fits; null when none does.
template<typename Elements, typename Predicate>
auto findFirst(Elements const& elements, Predicate fits) -> decltype(&elements.front().value) {
    auto const found = std::find_if(elements.begin(), elements.end(),
                                    [&](auto const& element) { return fits(element.value); });
    return found == elements.end() ? nullptr : &found->value;
}

PackPreset defaultPackPreset() {
    return PackPreset({{PackPreset::NAME_FLD_NAME.c_str(), Presets::CATCH_ALL_PACK_PRES_NAME},
                       {PackPreset::PROC_MODE_FLD_NAME.c_str(), CATCH_ALL_PROCESS_MODE}},
                      {});
}

ExtractPreset catchAllPreset() {
    std::vector<ExtractField> const fields{ExtractField::DefReference(), ExtractField::DefEmail(),
                                           ExtractField::DefFax(), ExtractField::DefSms(),
                                           ExtractField::DefPostal()};
    auto zones = std::make_shared<ExtractZones>();
    zones->emplace_back(ExtractZone::DEF_ZONE_NAME, fields);
    return ExtractPreset(Presets::CATCH_ALL_PATTERN, Presets::CATCH_ALL_PACK_PRES_NAME, std::move(zones));
}

} // namespace

template class Part<PresetFieldIdxs, PresetFields>;

std::string const Presets::PART_NAME = "presets";
std::string const Presets::CATCH_ALL_PATTERN = ".*";
std::string const Presets::CATCH_ALL_PACK_PRES_NAME = "GLOBAL";

PresetFields const Presets::FLDS_INIT{"extract_presets", "pack_presets"};

json::RecordKeys const& Presets::keys() {
    static json::RecordKeys const keys = keysOf(FLDS_INIT);
    return keys;
}

Presets::Presets(json::Value const& j, bool global, bool sorted) : Part(global, FLDS_INIT) {
    deserialize(j, sorted);
    if (global)
        addCatchAll();
}

bool Presets::empty() const {
    return elements<PresetFieldIdxs::ExtractPresets>().empty() &&
           elements<PresetFieldIdxs::PackPresets>().empty();
}

ExtractPreset const& Presets::matchExtrPreset(std::string const& docName) const {
    auto const* const preset =
        findFirst(elements<PresetFieldIdxs::ExtractPresets>(),
                  [&](ExtractPreset const& candidate) { return candidate.match(docName); });
    if (!preset)
        throw std::runtime_error("Failed to find extraction preset for " + docName);
    return *preset;
}

std::pair<ExtractPreset const&, PackPreset const&> Presets::findMatch(std::string const& docName) const {
    ExtractPreset const& extractPreset = matchExtrPreset(docName);
    PackPreset const* const packPreset = findPackPreset(extractPreset.packPresetName());
    if (!packPreset)
        throw std::runtime_error("Failed to find pack preset for extraction preset for " + docName);
    return {extractPreset, *packPreset};
}

void Presets::addCatchAll() {
    ExtractPreset const* const catchAll = findCatchAll();
    if (!findPackPreset(catchAll ? catchAll->packPresetName() : CATCH_ALL_PACK_PRES_NAME))
        addInherited<PresetFieldIdxs::PackPresets>(defaultPackPreset());
    if (!catchAll)
        addInherited<PresetFieldIdxs::ExtractPresets>(catchAllPreset());
}

ExtractPreset const* Presets::findCatchAll() const {
    return findFirst(elements<PresetFieldIdxs::ExtractPresets>(),
                     [](ExtractPreset const& preset) { return preset.strRegex() == CATCH_ALL_PATTERN; });
}

PackPreset const* Presets::findPackPreset(std::string const& name) const {
    return findFirst(elements<PresetFieldIdxs::PackPresets>(),
                     [&](PackPreset const& preset) { return preset.name() == name; });
}

} // namespace Cfg
