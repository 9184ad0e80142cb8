#pragma once
// What a near miss proposes, as a change of the settings' text.

#include "programs/vlmail/workbench/settings_in_work.h"

#include <optional>
#include <string>
#include <vector>

namespace VlMail::Workbench {

/// Where the text has what a near miss is about; null for what it does not have.
struct ChangePlaces {
    ListedExtractPreset const* preset = nullptr;
    ListedPackPreset const* pack = nullptr;
    ListedZone const* zone = nullptr;
    ListedField const* field = nullptr;
};

struct Proposal {
    std::vector<Edit> edits;
    /// What the edits do, as a line.
    std::string says;
};
using ProposedEdits = std::optional<Proposal>;

/// `change` is that of a near miss in an explanation; nothing when there is none, or what it would change is
/// not in the text.
ProposedEdits editsFor(SettingsText const& text, ChangePlaces const& places, json::Value const& change);

} // namespace VlMail::Workbench
