#include "programs/protocol/service_settings.h"

#include "programs/protocol/rows.h"

namespace Protocol {

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

json::Object serviceOverview(json::Object const& settings, std::string const& outbox,
                             json::Object const& jobCounts) {
    json::Object overview = settings;
    overview.set("outbox", outbox);
    overview.set("jobs", jobCounts);
    return overview;
}

} // namespace Protocol
