#pragma once
// What a node may set of its presets beside what can be read.

#include "programs/policy/slots.h"
#include "programs/vlserviced/store/settings_store.h"
#include "vlservice/json/json.h"

#include <vector>

namespace VlServiced {

/// Throws Error with one line when a pack preset of the part is one that a node above has locked
/// ("lock_pack_ui"), or has a delay that never ends. `chain` begins with the node itself.
void requireAllowedPresets(json::Object const& own, std::vector<SettingsLevel> const& chain,
                           Policy::Moment const& moment);

} // namespace VlServiced
