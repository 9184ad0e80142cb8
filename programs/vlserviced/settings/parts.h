#pragma once
// The six settings parts as the service handles them: by name, in JSON.

#include "programs/vlserviced/store/settings_store.h"

#include "vlservice/json/json.h"

#include <string>
#include <vector>

namespace VlServiced {

/// The names of the parts, in the order in which they are shown.
std::vector<std::string> const& partNames();

/// What of a sent part becomes the node's own: the flat form, without values that the sender had inherited
/// and without presets that bear an erase mark; the empty handle when nothing is left.
/// Throws Error with one line when the part has a key that is not its own or a value of a wrong type.
json::Value ownForm(std::string const& part, json::Value const& sent);

/// The settings that count at the first node of a chain: the form of Protocol::PartSettings for each wanted
/// part, by its name.
/// Throws Error with one line that names node and part when a stored part cannot be read.
json::Object resolve(std::vector<SettingsLevel> const& chain, std::vector<std::string> const& wantedParts);

} // namespace VlServiced
