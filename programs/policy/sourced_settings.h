#pragma once
// The settings that count at a node, with where each value comes from: a refusal names it.

#include "programs/protocol/settings.h"
#include "vlservice/json/json.h"

#include <string>

namespace Policy {

/// A value, and where it comes from as a person reads it: a node's id, "the root", "the built-in settings",
/// or the name of a document.
template<typename T>
struct Sourced {
    T value{};
    std::string source;
};

class SourcedSettings {
public:
    /// Nothing set: the built-in settings.
    SourcedSettings() = default;
    /// What counts at a node, as a service has resolved it; parts that were not asked for are built in.
    explicit SourcedSettings(Protocol::SettingsAnswer const& answer);
    /// A document {"app": {...}, ...} of that name, which holds the node's own values.
    SourcedSettings(json::Object parts, std::string document);

    /// The settings part, completed by built-in values. Throws std::exception when it cannot be read.
    template<typename Part>
    Part part() const {
        return Part(values_.get(Part::PART_NAME), true, false);
    }
    std::string sourceOf(std::string const& part, char const* key) const;
    /// Of the pack preset that a mailing of that preset's name goes by.
    std::string sourceOfPackPreset(std::string const& name) const;

private:
    /// By the part's name.
    json::Object values_;
    json::Object origins_;
    /// Empty for what a service has resolved.
    std::string document_;
};

} // namespace Policy
