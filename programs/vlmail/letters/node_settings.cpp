#include "programs/vlmail/letters/node_settings.h"

#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/base/json_schema.h"
#include "programs/base/quoting.h"
#include "programs/base/read_file.h"
#include "programs/reader/document.h"
#include "vlservice/cfg/app.h"
#include "vlservice/cfg/departments.h"
#include "vlservice/cfg/inet.h"
#include "vlservice/cfg/po.h"
#include "vlservice/cfg/profiles.h"
#include "vlservice/json/json_text.h"
#include "vlservice/presets/settings_parts.h"

#include <algorithm>
#include <iterator>
#include <string_view>

namespace VlMail {
namespace {

namespace fs = std::filesystem;

bool isPartName(std::string const& name) {
    std::string const* const names[] = {&Cfg::App::PART_NAME,      &Cfg::Inet::PART_NAME,
                                        &Cfg::PO::PART_NAME,       &Cfg::Departments::PART_NAME,
                                        &Cfg::Profiles::PART_NAME, &Cfg::Presets::PART_NAME};
    return std::any_of(std::begin(names), std::end(names),
                       [&](std::string const* part) { return *part == name; });
}

bool isPresetsPart(json::Object const& document) {
    return document.get("extract_presets") || document.get("pack_presets");
}

/// A misspelt part would be passed over in silence, and with it all of its settings.
void requirePartNames(json::Object const& document, std::string const& file) {
    for (auto const& [name, part] : document) {
        if (!isPartName(name) && std::string_view(name) != Base::Schema::KEY)
            throw Base::Error(Base::Code::SettingUnknown,
                              "cannot use the settings in " + Base::inQuotes(file) + ": \"" + name +
                                  "\" is no settings part; name the parts \"presets\", \"app\", \"inet\", "
                                  "\"po\", \"deps\" or "
                                  "\"profiles\"");
    }
}

/// What of a part is the node's own, in the order in which it counts.
template<typename Part>
void addOwn(json::Object& own, json::Value const& written, std::string const& place) {
    try {
        if (json::Value const form = Part(written, false, true).serialize())
            own.set(Part::PART_NAME, form);
    } catch (std::exception const& wrong) {
        throw Base::Error(Base::Code::SettingsMalformed, "cannot use the part \"" + Part::PART_NAME +
                                                             "\" in " + place + ": " + wrong.what() +
                                                             "; correct it there");
    }
}

template<typename... Parts>
json::Object ownParts(NodeSettings const& settings, Cfg::PartList<Parts...>) {
    json::Object own;
    (addOwn<Parts>(own, settings.part(Parts::PART_NAME), settings.place()), ...);
    return own;
}

json::Array joined(json::Array front, json::Array const& back) {
    for (json::Value const& one : back)
        front.append(one);
    return front;
}

json::Array repeated(std::string const& text, std::size_t times) {
    json::Array array;
    for (std::size_t i = 0; i < times; ++i)
        array.append(text);
    return array;
}

/// A list that is inherited by elements, which has an origin for each, has the node's own ones first.
Protocol::PartSettings withOwn(Protocol::PartSettings settings, json::Object const& own,
                               std::string const& node) {
    for (auto const& [key, value] : own) {
        json::Value const origins = settings.origins.get(key);
        bool const isByElements = origins.isArray();
        settings.values.set(
            key,
            isByElements ? json::Value(joined(value.toArray(), settings.values.get(key).toArray())) : value);
        settings.origins.set(
            key, isByElements ? json::Value(joined(repeated(node, value.toArray().size()), origins.toArray()))
                              : json::Value(node));
    }
    settings.own = own;
    return settings;
}

} // namespace

NodeSettings NodeSettings::over(Protocol::SettingsAnswer inherited) const {
    json::Object const own = ownParts(*this, Cfg::SettingsParts());
    for (auto const& [name, values] : own)
        inherited.parts.set(name, withOwn(inherited.part(name), values.toObject(), inherited.id).serialize());
    return resolved(inherited, place_);
}

NodeSettings NodeSettings::fromFile(fs::path const& file) {
    NodeSettings settings = fromText(Base::readFile(file), file.string());
    settings.file_ = file;
    return settings;
}

NodeSettings NodeSettings::fromText(std::string text, std::string const& name) {
    NodeSettings settings;
    settings.text_ = std::move(text);
    settings.place_ = Base::inQuotes(name);
    try {
        settings.parts_ = json::strToObject(settings.text_.data(), settings.text_.size());
    } catch (json::Exc const& wrong) {
        throw Base::Error(Base::Code::SettingsMalformed, "cannot read the settings in " +
                                                             Base::inQuotes(name) + ": " + wrong.what() +
                                                             "; correct the file there");
    }
    if (isPresetsPart(settings.parts_))
        settings.parts_ = json::Object{{Cfg::Presets::PART_NAME.c_str(), settings.parts_}};
    requirePartNames(settings.parts_, name);
    settings.sourced_ = Policy::SourcedSettings(settings.parts_, name);
    settings.presets();
    return settings;
}

std::string NodeSettings::sha256() const { return file_.empty() ? std::string() : Base::sha256(text_); }

NodeSettings NodeSettings::fromFileIfNamed(std::string const& file) {
    return file.empty() ? NodeSettings() : fromFile(file);
}

NodeSettings NodeSettings::resolved(json::Object parts, std::string place) {
    NodeSettings settings;
    settings.parts_ = std::move(parts);
    settings.place_ = std::move(place);
    // Own presets stand in front of inherited ones, whatever their order.
    settings.sorted_ = false;
    return settings;
}

NodeSettings NodeSettings::resolved(Protocol::SettingsAnswer const& answer, std::string place) {
    json::Object parts;
    for (auto const& [name, part] : answer.parts)
        parts.set(name, Protocol::PartSettings(part.toObject()).values);
    NodeSettings settings = resolved(std::move(parts), std::move(place));
    settings.answer_ = answer.serialize();
    settings.sourced_ = Policy::SourcedSettings(answer);
    return settings;
}

Cfg::Presets NodeSettings::presets() const {
    try {
        return Cfg::Presets(part(Cfg::Presets::PART_NAME), true, sorted_);
    } catch (std::exception const& wrong) {
        throw Base::Error(Base::Code::SettingsMalformed, "cannot use the presets in " + place_ + ": " +
                                                             wrong.what() + "; correct them there");
    }
}

Cfg::App const& NodeSettings::app() const {
    try {
        if (!app_)
            app_ = std::make_shared<Cfg::App const>(part(Cfg::App::PART_NAME), true, sorted_);
        return *app_;
    } catch (std::exception const& wrong) {
        throw Base::Error(Base::Code::SettingsMalformed, "cannot use the part \"app\" in " + place_ + ": " +
                                                             wrong.what() + "; correct it there");
    }
}

Policy::Rules const& NodeSettings::rules() const {
    if (!rules_)
        rules_ = std::make_shared<Policy::Rules const>(sourced_);
    return *rules_;
}

} // namespace VlMail
