#pragma once
// All the settings parts of a node, for those who walk them: by class when a program is compiled, by name and
// keys when it runs.

#include "vlservice/cfg/app.h"
#include "vlservice/cfg/departments.h"
#include "vlservice/cfg/inet.h"
#include "vlservice/cfg/po.h"
#include "vlservice/cfg/profiles.h"
#include "vlservice/export.h"
#include "vlservice/json/record_keys.h"
#include "vlservice/presets/presets.h"

#include <span>
#include <string>
#include <string_view>

namespace Cfg {

template<typename... Parts>
struct PartList {};

/// In the order in which people are shown them.
using SettingsParts = PartList<App, Inet, PO, Departments, Profiles, Presets>;

/// A part as it can be told at run time. Both references live as long as the library.
struct PartInfo {
    std::string const& name;      ///< in settings documents
    json::RecordKeys const& keys; ///< of its object
};

/// In the order of SettingsParts.
VLSERVICE_EXPORT std::span<PartInfo const> settingsParts();

/// Null when no part has that name.
VLSERVICE_EXPORT PartInfo const* findSettingsPart(std::string_view name);

} // namespace Cfg
