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

} // namespace

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
