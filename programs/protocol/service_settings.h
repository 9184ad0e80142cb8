#pragma once
// The service's own settings, beside those of the nodes, as client and service speak of them.

#include "vlservice/json/json.h"

#include <string>
#include <vector>

namespace Protocol {

/// What is held back for the time being: the bits of CSConfigSrvChange's number.
enum class Suspended : int {
    Nothing = 0,
    /// Settings can be read and not changed.
    SettingsChanges = 1,
    /// Jobs are accepted and wait.
    Jobs = 2,
    All = 3,
};

/// The service's settings. A change is an object with some of the keys, where JSON null erases one.
struct ServiceSettings {
    static constexpr char const* UPLOAD_FOLDER = "upload_folder";
    static constexpr char const* TARIFF = "tariff";
    static constexpr char const* CARRIERS = "carriers";
    static constexpr char const* DISABLED = "disabled";
    static constexpr char const* QUOTA = "quota";
    static constexpr char const* RETENTION_DAYS = "retention_days";
    static constexpr char const* SUSPENDED = "suspended";
    static constexpr int RETENTION_DAYS_UNLESS_SET = 90;
    static constexpr long long MAX_RETENTION_DAYS = 36'500;
    static constexpr long long MAX_QUOTA_MEBIBYTES = 1LL << 30;

    /// Where finished containers are handed on; empty when nothing was set.
    std::string uploadFolder;
    /// The form of Tariff; empty when there is none.
    json::Object tariff;
    /// The form of carriersIn(); empty when there are none.
    json::Object carriers;
    /// Ids of nodes that nobody may send for, with all below them.
    std::vector<std::string> disabled;
    /// MiB that the packs of a node may have with the service at once, by the node's id; nodes below that
    /// have none of their own have the same.
    json::Object quota;
    /// How long jobs and containers are kept after their end; 0 is for ever.
    int retentionDays = RETENTION_DAYS_UNLESS_SET;
    /// Bits of Suspended.
    int suspended = 0;

    ServiceSettings() = default;
    explicit ServiceSettings(json::Object const& object);

    struct Keys;
};

/// What a value of a setting is.
enum class SettingForm { Text, Number, List, Document };

/// A setting that a change may name, and its form.
struct ServiceSetting {
    char const* key;
    SettingForm form;
    /// How a command line gives it.
    char const* placeholder;
};

inline constexpr ServiceSetting SETTABLE[] = {
    {ServiceSettings::UPLOAD_FOLDER, SettingForm::Text, "PATH"},
    {ServiceSettings::TARIFF, SettingForm::Document, "FILE"},
    {ServiceSettings::CARRIERS, SettingForm::Document, "FILE"},
    {ServiceSettings::DISABLED, SettingForm::List, "[...]"},
    {ServiceSettings::QUOTA, SettingForm::Document, "{...}"},
    {ServiceSettings::RETENTION_DAYS, SettingForm::Number, "N"},
};

/// What each of them may be, as a JSON schema; `carriers` and `tariff` are those of these two.
json::Object serviceSettingsSchema(json::Object const& carriers, json::Object const& tariff);

/// What the service tells of itself beside its settings: its outbox, and how many jobs are in each state that
/// any is in, by the state's name.
json::Object serviceOverview(json::Object const& settings, std::string const& outbox,
                             json::Object const& jobCounts);

} // namespace Protocol
