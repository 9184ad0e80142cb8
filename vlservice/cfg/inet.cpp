#include "vlservice/cfg/inet.h"

namespace Cfg {

template class Part<InetFieldIdxs, InetFields>;

std::string const Inet::PART_NAME = "inet";

InetFields const Inet::FLDS_INIT{
    "help_url",           "contact_url", "status_update_hours", "submitted_alarm_hours",
    "lodged_alarm_hours", "wizard_image"};

std::string const Inet::DEF_HELP_URL = "https://help.vlservice.example/";
std::string const Inet::DEF_CONTACT_URL = "https://vlservice.example/contact";

Inet::Inet(json::Value const& j, bool global, bool sorted) : Part(global, FLDS_INIT) {
    deserialize(j, sorted);
    if (global)
        setGlobalDefs();
}

void Inet::setGlobalDefs() {
    using enum InetFieldIdxs;
    setDefaultIfInherited<HelpUrl>(DEF_HELP_URL);
    setDefaultIfInherited<ContactUrl>(DEF_CONTACT_URL);
    setDefaultIfInherited<StatusUpdateHours>(DEF_STATUS_UPDATE_HOURS);
    setDefaultIfInherited<SubmittedAlarmHours>(DEF_SUBMITTED_ALARM_HOURS);
    setDefaultIfInherited<LodgedAlarmHours>(DEF_LODGED_ALARM_HOURS);
}

} // namespace Cfg
