#pragma once
// The settings that a command works with, from a JSON document on disk.

#include "programs/policy/limits.h"
#include "programs/policy/sourced_settings.h"
#include "programs/protocol/settings.h"
#include "vlservice/cfg/app.h"
#include "vlservice/json/json.h"
#include "vlservice/presets/presets.h"

#include <filesystem>
#include <memory>
#include <optional>
#include <string>

namespace VlMail {

/// A node's settings parts as JSON. The document holds parts under their names, {"presets": {...}, "app":
/// {...}}, or is the part "presets" itself.
class NodeSettings {
public:
    /// Nothing set: the global defaults apply.
    NodeSettings() = default;
    /// Throws std::runtime_error with a line for people when the file cannot be read or is not such a
    /// document.
    static NodeSettings fromFile(std::filesystem::path const& file);
    /// The same of a text that a person calls by that name.
    static NodeSettings fromText(std::string text, std::string const& name);
    /// The same, or the global defaults for an empty name.
    static NodeSettings fromFileIfNamed(std::string const& file);
    /// What counts at a node, {"presets": ...} and so on, in the order in which a service has resolved it.
    static NodeSettings resolved(json::Object parts, std::string place);
    /// The same, with the node that each value comes from.
    static NodeSettings resolved(Protocol::SettingsAnswer const& answer, std::string place);

    /// These as a node's own values over those that it inherits, which a service was asked for; called the
    /// same. Throws Error when a part cannot be understood.
    NodeSettings over(Protocol::SettingsAnswer inherited) const;

    /// Completed by the global defaults, so that a pair of presets exists for every document's name.
    /// Throws Error when the part cannot be understood. Every call builds new objects from JSON of their own.
    Cfg::Presets presets() const;
    /// The part "app", completed by the global defaults. Throws Error when it cannot be understood. Read at
    /// the first call, as rules().
    Cfg::App const& app() const;
    /// What they allow. Throws std::exception when a part cannot be understood.
    Policy::Rules const& rules() const;
    /// The part's JSON as it stands in the document; the empty handle when it is not there.
    json::Value part(std::string const& name) const { return parts_.get(name); }
    /// With where each value comes from: a node, or the file.
    Policy::SourcedSettings const& sourced() const { return sourced_; }
    /// Empty for settings that are not from a file.
    std::filesystem::path const& file() const { return file_; }
    /// The service's answer that they are; the empty handle for others.
    json::Value const& answer() const { return answer_; }
    /// Whether the service sends notices whose answer they are; nothing for others.
    std::optional<bool> sendsNotices() const {
        return answer_ ? Protocol::SettingsAnswer(answer_.toObject()).sendsNotices() : std::nullopt;
    }
    /// Where they come from, as messages say it.
    std::string const& place() const { return place_; }
    /// Of the file as it was read; empty for the defaults. Computed at each call: few want it, and the first
    /// digest of a process costs more than a short letter.
    std::string sha256() const;

private:
    std::filesystem::path file_;
    std::string text_;
    std::string place_ = "the settings";
    bool sorted_ = true;
    json::Object parts_;
    json::Value answer_;
    Policy::SourcedSettings sourced_;
    mutable std::shared_ptr<Cfg::App const> app_;
    mutable std::shared_ptr<Policy::Rules const> rules_;
};

} // namespace VlMail
