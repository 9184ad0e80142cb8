#pragma once
// A new preset from documents: what was seen in them, to be ticked by a person, and the settings with it.

#include "programs/reader/document.h"
#include "programs/vlmail/workbench/settings_in_work.h"

#include <vector>

namespace VlMail::Workbench {

/// {"match", "address", "fields", "pack_preset", "evidence"}. Throws Base::Error when a document cannot be
/// read.
json::Object proposalFrom(std::vector<Reader::Document>& documents);

struct Adopted {
    SettingsText text;
    /// Of the new preset.
    std::string pointer;
};

/// The settings with what is left of a proposal, in front of the presets that are there: theirs may fit any
/// name. Throws json::Exc when it is no proposal.
Adopted adopted(SettingsInWork const& settings, json::Object const& proposal);

} // namespace VlMail::Workbench
