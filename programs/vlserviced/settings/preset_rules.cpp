#include "programs/vlserviced/settings/preset_rules.h"

#include "programs/base/error.h"
#include "programs/base/quoting.h"
#include "programs/policy/limits.h"
#include "vlservice/presets/presets.h"

#include <map>
#include <string>

namespace VlServiced {
namespace {

/// By the name of a pack preset the id of the node that has locked it, the nearest one.
using Locks = std::map<std::string, std::string>;

json::Array packPresetsIn(json::Value const& part) {
    json::Value const list = part ? part.toObject().get("pack_presets") : json::Value();
    return list ? list.toArray() : json::Array();
}

Locks locksAbove(std::vector<SettingsLevel> const& chain) {
    Locks locks;
    for (std::size_t above = 1; above < chain.size(); ++above)
        for (json::Value const& preset : packPresetsIn(chain[above].parts.get(Cfg::Presets::PART_NAME)))
            if (preset.toObject().get("lock_pack_ui").isTrue())
                locks.emplace(preset.toObject().get("name").textOrEmpty(), chain[above].id);
    return locks;
}

[[noreturn]] void refuse(std::string const& packPreset, std::string const& why) {
    throw Base::Error(Base::Code::SettingInvalid,
                      "the settings \"presets\" were not changed: the pack preset " +
                          Base::inQuotes(packPreset) + ' ' + why);
}

void requireUnlocked(Cfg::PackPreset const& preset, Locks const& locks) {
    auto const lock = locks.find(preset.name());
    if (lock == locks.end())
        return;
    std::string const node = lock->second.empty() ? "the root" : lock->second;
    refuse(preset.name(), "is locked by " + node + " (\"lock_pack_ui\"): nodes below cannot replace it");
}

void requireDelayThatEnds(Cfg::PackPreset const& preset, Policy::Moment const& moment) {
    if (!preset.pDelayInfo())
        return;
    std::string const why = Policy::whyImpossible(*preset.pDelayInfo(), moment);
    if (!why.empty())
        refuse(preset.name(), "has a delay that never ends: " +
                                  std::string(codeOf(Policy::Limit::DelayImpossible)) + ": " + why);
}

} // namespace

void requireAllowedPresets(json::Object const& own, std::vector<SettingsLevel> const& chain,
                           Policy::Moment const& moment) {
    Locks const locks = locksAbove(chain);
    for (json::Value const& element : packPresetsIn(own)) {
        Cfg::PackPreset const preset(element.toObject(), {});
        requireUnlocked(preset, locks);
        requireDelayThatEnds(preset, moment);
    }
}

} // namespace VlServiced
