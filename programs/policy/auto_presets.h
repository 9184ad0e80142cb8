#pragma once
// Presets that programs have made for one document's name, and that go when nobody uses them any more.

#include "vlservice/json/json.h"

#include <string>

namespace Policy {

/// How long such a preset is kept unused, in seconds.
inline constexpr long long MAX_UNUSED_SECONDS = 90 * 86'400LL;

/// Whether pack presets of that name are such.
bool expiresUnused(std::string const& packPreset);

// `presets` is a node's own part "presets" in flat form. Extraction presets belong to the pack preset that
// they name: with it they were used, and with it they go. The empty handle says that nothing changes.

/// With the time at which the pack preset of that name was used.
json::Value withUse(json::Object const& presets, std::string const& packPreset, long long now);

/// Without those that nobody has used for too long. Those that bear no time begin to count now.
json::Value withoutUnused(json::Object const& presets, long long now);

} // namespace Policy
