#include "programs/protocol/service_settings.h"

#include "programs/protocol/rows.h"

namespace Protocol {
namespace {

constexpr char const* OUTBOX = "outbox";
constexpr char const* JOBS = "jobs";

} // namespace

struct ServiceSettings::Keys {
    static constexpr std::tuple TABLE{
        Always{UPLOAD_FOLDER, &ServiceSettings::uploadFolder},
        Always{TARIFF, &ServiceSettings::tariff},
        Always{CARRIERS, &ServiceSettings::carriers},
        Always{DISABLED, &ServiceSettings::disabled},
        Always{QUOTA, &ServiceSettings::quota},
        json::Key{RETENTION_DAYS, &ServiceSettings::retentionDays, RETENTION_DAYS_UNLESS_SET},
        Always{SUSPENDED, &ServiceSettings::suspended},
    };
};

ServiceSettings::ServiceSettings(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }

json::Object serviceSettingsSchema(json::Object const& carriers, json::Object const& tariff) {
    using Settings = ServiceSettings;
    namespace Schema = Base::Schema;
    json::Object const id = Schema::with(Schema::text(), "minLength", 1);
    return Schema::Members(Schema::Members::Others::Refused)
        .add(Settings::UPLOAD_FOLDER, Schema::textLike("^/"))
        .add(Settings::TARIFF, tariff)
        .add(Settings::CARRIERS, carriers)
        .add(Settings::DISABLED, Schema::listOf(id))
        .add(Settings::QUOTA, Schema::mapOf(Schema::integer(0, Settings::MAX_QUOTA_MEBIBYTES)))
        .add(Settings::RETENTION_DAYS, Schema::with(Schema::integer(0, Settings::MAX_RETENTION_DAYS),
                                                    "default", Settings::RETENTION_DAYS_UNLESS_SET))
        .add(Settings::SUSPENDED, Schema::integer(0, static_cast<int>(Suspended::All)))
        .add(OUTBOX, Schema::text())
        .add(JOBS, Schema::mapOf(Schema::integer(0)))
        .schema();
}

json::Object serviceOverview(json::Object const& settings, std::string const& outbox,
                             json::Object const& jobCounts) {
    json::Object overview = settings;
    overview.set(OUTBOX, outbox);
    overview.set(JOBS, jobCounts);
    return overview;
}

} // namespace Protocol
