#include "vlservice/presets/settings_parts.h"

#include <algorithm>
#include <array>

namespace Cfg {
namespace {

template<typename... Parts>
auto infosOf(PartList<Parts...>) {
    return std::array{PartInfo{Parts::PART_NAME, Parts::keys()}...};
}

} // namespace

std::span<PartInfo const> settingsParts() {
    static auto const parts = infosOf(SettingsParts());
    return parts;
}

PartInfo const* findSettingsPart(std::string_view name) {
    auto const parts = settingsParts();
    auto const found = std::ranges::find_if(parts, [&](PartInfo const& part) { return part.name == name; });
    return found == parts.end() ? nullptr : &*found;
}

} // namespace Cfg
