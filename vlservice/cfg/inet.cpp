#include "vlservice/cfg/inet.h"

namespace Cfg {

template class Part<InetFieldIdxs, InetFields>;

std::string const Inet::PART_NAME = "inet";

std::string const Inet::DEF_HELP_URL = "https://help.vlservice.example/";
std::string const Inet::DEF_CONTACT_URL = "https://vlservice.example/contact";

InetFields const Inet::FLDS_INIT{{"help_url", RootDefault{DEF_HELP_URL}},
                                 {"contact_url", RootDefault{DEF_CONTACT_URL}},
                                 {"status_update_hours", RootDefault{DEF_STATUS_UPDATE_HOURS}},
                                 {"submitted_alarm_hours", RootDefault{DEF_SUBMITTED_ALARM_HOURS}},
                                 {"lodged_alarm_hours", RootDefault{DEF_LODGED_ALARM_HOURS}},
                                 {"wizard_image"}};

json::RecordKeys const& Inet::keys() {
    static json::RecordKeys const keys = keysOf(FLDS_INIT);
    return keys;
}

Inet::Inet(json::Value const& j, bool global, bool sorted) : Part(global, FLDS_INIT) {
    deserialize(j, sorted);
    if (global)
        setGlobalDefs();
}

void Inet::setGlobalDefs() { takeRootDefaults(); }

} // namespace Cfg
