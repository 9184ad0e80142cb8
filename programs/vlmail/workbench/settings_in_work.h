#pragma once
// Settings while they are being written: the text, what it means, and what stands where.

#include "programs/protocol/settings.h"
#include "programs/vlmail/letters/node_settings.h"
#include "programs/vlmail/letters/preset_index.h"
#include "programs/vlmail/presets/presets_document.h"
#include "programs/vlmail/workbench/settings_text.h"

#include <memory>
#include <optional>
#include <string>

namespace VlMail::Workbench {

class SettingsInWork {
public:
    /// With what a node inherits, if they are a node's. Throws Base::Error for what is no JSON.
    explicit SettingsInWork(std::string text, std::shared_ptr<Protocol::SettingsAnswer const> inherited = {});

    SettingsText const& text() const { return text_; }
    PresetsDocument const& document() const { return document_; }
    /// With the presets that are inherited behind those in the text.
    PresetsDocument whole() const;
    /// What lint finds, as {"severity", "kind", "pointer", "from", "to", "what", "advice"}.
    json::Array const& findings();
    /// Whether they are known.
    bool isLookedOver() const { return findings_.has_value(); }

    /// Throw Base::Error when the settings cannot be used.
    NodeSettings const& node() { return used().node; }
    PresetIndex const& presets() { return used().index; }

    /// Where the text has a preset that was found; null for one that was added by default.
    ListedExtractPreset const* listed(Cfg::ExtractPreset const& preset) const;
    ListedPackPreset const* listedPack(std::string const& name) const;
    /// Its zone of that number, null when there is none of its name.
    static ListedZone const* listed(ListedExtractPreset const* preset, Cfg::ExtractPreset const& of,
                                    Cfg::ExtractZone const& zone);
    static ListedField const* listed(ListedZone const* zone, Cfg::ExtractZone const& of,
                                     Cfg::ExtractField const& field);

private:
    struct Used {
        explicit Used(NodeSettings settings);

        NodeSettings node;
        Cfg::Presets presets;
        PresetIndex index;
    };

    Used& used();

    SettingsText text_;
    std::shared_ptr<Protocol::SettingsAnswer const> inherited_;
    PresetsDocument document_;
    std::optional<json::Array> findings_;
    std::optional<Used> used_;
};

/// {"line", "ch"}.
json::Object toJson(Position const& position);
json::Array toJson(std::vector<Edit> const& edits);
/// A place of settings as a pointer, null for none.
template<typename Listed>
json::Value pointerOf(Listed const* listed) {
    return listed ? json::Value(listed->place.pointer()) : json::Value(json_null());
}

} // namespace VlMail::Workbench
