#include "programs/vlserviced/settings/service_settings.h"

#include "programs/base/error.h"
#include "programs/vlserviced/store/node_id.h"

#include <algorithm>
#include <filesystem>
#include <string_view>
#include <utility>

namespace VlServiced {
namespace {

using Values = Protocol::ServiceSettings;

constexpr char const* FOLDER_IDENTITY = "upload_folder_identity";
/// An object of channels.
constexpr char const* CARRIER_FOLDERS = "carrier_folder_identities";

void checkUploadFolder(json::Value const& value) {
    std::filesystem::path const folder = value.textOrEmpty();
    std::error_code error;
    if (!folder.is_absolute() || !std::filesystem::is_directory(folder, error))
        throw Base::Error(Base::Code::SettingInvalid,
                          '"' + std::string(Values::UPLOAD_FOLDER) +
                              "\" has to be the absolute path of a folder that is there");
}

void checkTariff(json::Value const& value) {
    if (!value.isObject())
        throw Base::Error(Base::Code::SettingInvalid, "\"tariff\" has to be an object");
    Protocol::Tariff const readable(value.toObject());
}

void checkDisabled(json::Value const& value) {
    if (!value.isArray())
        throw Base::Error(Base::Code::SettingInvalid, "\"disabled\" has to be an array of node ids");
    for (json::Value const& id : value.toArray()) {
        // Anything but a text would read as the root.
        if (!id.isString() || id.textOrEmpty().empty())
            throw Base::Error(Base::Code::SettingInvalid,
                              "\"disabled\" has to be an array of node ids, and the root cannot be disabled");
        checkNodeId(id.toString());
    }
}

void checkCarriers(json::Value const& value) {
    if (!value.isObject())
        throw Base::Error(Base::Code::SettingInvalid,
                          "\"carriers\" has to be an object with the names of channels");
    Protocol::carriersIn(value.toObject());
}

bool isWithin(json::Value const& value, long long highest) {
    return value.isInt() && value.toInt() >= 0 && value.toInt() <= highest;
}

void checkQuota(json::Value const& value) {
    if (!value.isObject())
        throw Base::Error(Base::Code::SettingInvalid,
                          "\"quota\" has to be an object of node ids and numbers of MiB");
    for (auto const& [node, mebibytes] : value.toObject()) {
        checkNodeId(node);
        if (!isWithin(mebibytes, Values::MAX_QUOTA_MEBIBYTES))
            throw Base::Error(Base::Code::SettingInvalid, "the \"quota\" of node \"" + std::string(node) +
                                                              "\" has to be an integer from 0 to " +
                                                              std::to_string(Values::MAX_QUOTA_MEBIBYTES));
    }
}

void checkRetention(json::Value const& value) {
    if (!isWithin(value, Values::MAX_RETENTION_DAYS))
        throw Base::Error(Base::Code::SettingInvalid, "\"retention_days\" has to be an integer from 0 to " +
                                                          std::to_string(Values::MAX_RETENTION_DAYS));
}

void checkValue(std::string const& key, json::Value const& value) {
    if (key == Values::UPLOAD_FOLDER)
        checkUploadFolder(value);
    else if (key == Values::TARIFF)
        checkTariff(value);
    else if (key == Values::CARRIERS)
        checkCarriers(value);
    else if (key == Values::QUOTA)
        checkQuota(value);
    else if (key == Values::RETENTION_DAYS)
        checkRetention(value);
    else
        checkDisabled(value);
}

bool isSettable(std::string const& key) {
    return std::ranges::any_of(Protocol::SETTABLE,
                               [&](Protocol::ServiceSetting const& setting) { return key == setting.key; });
}

std::string settableKeys() {
    std::string keys;
    for (Protocol::ServiceSetting const& setting : Protocol::SETTABLE)
        keys += (keys.empty() ? "" : ", ") + std::string(setting.key);
    return keys;
}

void checkChange(std::string const& key, json::Value const& value) {
    if (!isSettable(key))
        throw Base::Error(Base::Code::SettingUnknown,
                          "the service has no setting \"" + key + "\"; there are " + settableKeys());
    if (!json_is_null(value.node()))
        checkValue(key, value);
}

json::Object without(char const* key, json::Object const& settings) {
    json::Object less;
    for (auto const& [name, value] : settings)
        if (name != std::string_view(key))
            less.set(name, value);
    return less;
}

} // namespace

ServiceSettings::ServiceSettings(json::Object stored)
    : stored_(std::move(stored)), values_(stored_),
      disabled_(values_.disabled.begin(), values_.disabled.end()) {}

json::Object ServiceSettings::told() const {
    return without(FOLDER_IDENTITY, without(CARRIER_FOLDERS, stored_));
}

std::string ServiceSettings::uploadFolderIdentity() const {
    return stored_.get(FOLDER_IDENTITY).textOrEmpty();
}

Protocol::Carriers ServiceSettings::carriers() const {
    Protocol::Carriers carriers = Protocol::carriersIn(values_.carriers);
    json::Value const identities = stored_.get(CARRIER_FOLDERS);
    if (identities.isObject())
        for (auto& [channel, settings] : carriers)
            settings.folderIdentity = identities.toObject().get(channel).textOrEmpty();
    return carriers;
}

ServiceSettings ServiceSettings::withFolderIdentity(std::string const& identity) const {
    json::Object changed = without(FOLDER_IDENTITY, stored_);
    if (!identity.empty())
        changed.set(FOLDER_IDENTITY, identity);
    return ServiceSettings(std::move(changed));
}

ServiceSettings
ServiceSettings::withCarrierFolders(std::map<std::string, std::string> const& identities) const {
    json::Object changed = without(CARRIER_FOLDERS, stored_);
    json::Object channels;
    for (auto const& [channel, identity] : identities)
        channels.set(channel, identity);
    if (!channels.empty())
        changed.set(CARRIER_FOLDERS, channels);
    return ServiceSettings(std::move(changed));
}

Protocol::Tariff ServiceSettings::tariff() const {
    if (values_.tariff.empty())
        throw Base::Error(
            Base::Code::SettingMissing,
            "the service has no tariff yet: set one with \"vlmail settings service tariff=FILE\"");
    return Protocol::Tariff(values_.tariff);
}

bool ServiceSettings::isDisabled(std::string const& nodeId) const {
    for (std::string at = nodeId; !at.empty(); at = parentNodeId(at))
        if (disabled_.contains(at))
            return true;
    return false;
}

std::optional<long long> ServiceSettings::quotaOf(std::string const& nodeId) const {
    for (std::string at = nodeId;; at = parentNodeId(at)) {
        if (json::Value const mebibytes = values_.quota.get(at.c_str()))
            return mebibytes.toInt() << 20;
        if (at.empty())
            return std::nullopt;
    }
}

bool ServiceSettings::isSuspended(Suspended what) const {
    return (values_.suspended & static_cast<int>(what)) != 0;
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
    if ((bits & ~static_cast<int>(Suspended::All)) != 0)
        throw Base::Error(Base::Code::SettingInvalid,
                          "the service cannot be suspended by the number " + std::to_string(bits) +
                              ": 1 holds back changes of settings, 2 holds back jobs, 3 both, 0 nothing");
    json::Object changed = stored_;
    changed.set(Values::SUSPENDED, bits);
    return ServiceSettings(std::move(changed));
}

} // namespace VlServiced
