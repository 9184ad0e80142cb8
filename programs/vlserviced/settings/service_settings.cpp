#include "programs/vlserviced/settings/service_settings.h"

#include "programs/base/error.h"
#include "programs/vlserviced/node_id.h"
#include "vlservice/cfg/cfg_node_id.h"
#include "vlservice/cfg/id.h"

#include <algorithm>
#include <filesystem>
#include <utility>

namespace VlServiced {
namespace {

constexpr char const* UPLOAD_FOLDER = "upload_folder";
constexpr char const* TARIFF = "tariff";
constexpr char const* DISABLED = "disabled";
constexpr char const* SUSPENDED = "suspended";

void checkUploadFolder(json::Value const& value) {
    std::filesystem::path const folder = value.textOrEmpty();
    std::error_code error;
    if (!folder.is_absolute() || !std::filesystem::is_directory(folder, error))
        throw Base::Error("\"upload_folder\" has to be the absolute path of a folder that is there");
}

void checkTariff(json::Value const& value) {
    if (!value.isObject())
        throw Base::Error("\"tariff\" has to be an object");
    Tariff const readable(value.toObject());
}

void checkDisabled(json::Value const& value) {
    if (!value.isArray())
        throw Base::Error("\"disabled\" has to be an array of node ids");
    for (json::Value const& id : value.toArray()) {
        // Anything but a text would read as the root.
        if (!id.isString() || id.textOrEmpty().empty())
            throw Base::Error("\"disabled\" has to be an array of node ids, and the root cannot be disabled");
        checkNodeId(id.toString());
    }
}

constexpr std::pair<char const*, void (*)(json::Value const&)> SETTABLE[] = {
    {UPLOAD_FOLDER, &checkUploadFolder},
    {TARIFF, &checkTariff},
    {DISABLED, &checkDisabled},
};

void checkChange(std::string const& key, json::Value const& value) {
    auto const* const row =
        std::find_if(std::begin(SETTABLE), std::end(SETTABLE), [&](auto const& r) { return key == r.first; });
    if (row == std::end(SETTABLE))
        throw Base::Error("the service has no setting \"" + key +
                          "\"; there are upload_folder, tariff, disabled");
    if (!json_is_null(value.node()))
        row->second(value);
}

} // namespace

ServiceSettings::ServiceSettings(json::Object stored) : stored_(std::move(stored)) {}

std::string ServiceSettings::uploadFolder() const { return stored_.get(UPLOAD_FOLDER).textOrEmpty(); }

Tariff ServiceSettings::tariff() const {
    json::Value const tariff = stored_.get(TARIFF);
    if (!tariff)
        throw Base::Error(
            "the service has no tariff yet: set one with \"vlmail settings service tariff=FILE\"");
    return Tariff(tariff.toObject());
}

bool ServiceSettings::isDisabled(std::string const& nodeId) const {
    json::Value const disabled = stored_.get(DISABLED);
    if (!disabled)
        return false;
    Cfg::CfgNodeId const node{Cfg::Id(nodeId, false)};
    return std::ranges::any_of(disabled.toArray(), [&](json::Value const& id) {
        Cfg::CfgNodeId const listed{Cfg::Id(id)};
        return listed == node || listed.isParentOf(node);
    });
}

bool ServiceSettings::isSuspended(Suspended what) const {
    return (stored_.get(SUSPENDED).intOrZero() & static_cast<int>(what)) != 0;
}

ServiceSettings ServiceSettings::withChanges(json::Object const& changes) const {
    for (auto const& [key, value] : changes)
        checkChange(key, value);
    json::Object merged;
    for (auto const& [key, value] : stored_)
        if (!changes.get(key))
            merged.set(key, value);
    for (auto const& [key, value] : changes)
        if (!json_is_null(value.node()))
            merged.set(key, value);
    return ServiceSettings(std::move(merged));
}

ServiceSettings ServiceSettings::withSuspended(int bits) const {
    constexpr int KNOWN = static_cast<int>(Suspended::SettingsChanges) | static_cast<int>(Suspended::Jobs);
    if ((bits & ~KNOWN) != 0)
        throw Base::Error("the service cannot be suspended by the number " + std::to_string(bits) +
                          ": 1 holds back changes of settings, 2 holds back jobs, 3 both, 0 nothing");
    json::Object changed = stored_;
    changed.set(SUSPENDED, bits);
    return ServiceSettings(std::move(changed));
}

} // namespace VlServiced
