#include "programs/policy/sourced_settings.h"

#include "vlservice/presets/presets.h"

#include <utility>

namespace Policy {
namespace {

constexpr char const* BUILT_IN = "the built-in settings";

/// The id of a node, or JSON null for what is built in.
std::string inWords(json::Value const& origin) {
    if (!origin.isString())
        return BUILT_IN;
    std::string const id = origin.textOrEmpty();
    return id.empty() ? "the root" : id;
}

json::Value member(json::Object const& objects, std::string const& name, char const* key) {
    json::Value const object = objects.get(name.c_str());
    return object.isObject() ? object.toObject().get(key) : json::Value();
}

} // namespace

SourcedSettings::SourcedSettings(Protocol::SettingsAnswer const& answer) {
    for (auto const& [name, part] : answer.parts) {
        Protocol::PartSettings const settings(part.toObject());
        values_.set(name, settings.values);
        origins_.set(name, settings.origins);
    }
}

SourcedSettings::SourcedSettings(json::Object parts, std::string document)
    : values_(std::move(parts)), document_(std::move(document)) {}

std::string SourcedSettings::sourceOf(std::string const& part, char const* key) const {
    if (document_.empty())
        return inWords(member(origins_, part, key));
    return member(values_, part, key) ? document_ : BUILT_IN;
}

std::string SourcedSettings::sourceOfPackPreset(std::string const& name) const {
    constexpr char const* KEY = "pack_presets";
    json::Value const presets = member(values_, Cfg::Presets::PART_NAME, KEY);
    json::Value const origins = member(origins_, Cfg::Presets::PART_NAME, KEY);
    for (std::size_t i = 0; presets.isArray() && i < presets.toArray().size(); ++i) {
        json::Value const preset = presets.toArray().at(i);
        if (!preset.isObject() || preset.toObject().get("name").textOrEmpty() != name)
            continue;
        return document_.empty() ? inWords(origins.isArray() ? origins.toArray().at(i) : json::Value())
                                 : document_;
    }
    return BUILT_IN;
}

} // namespace Policy
