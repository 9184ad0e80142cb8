#pragma once
// The service's endpoints and the hours of its alarms.

#include "vlservice/cfg/part.h"
#include "vlservice/export.h"

#include <string>
#include <tuple>

namespace Cfg {

enum class VLSERVICE_EXPORT InetFieldIdxs {
    HelpUrl,
    ContactUrl,
    StatusUpdateHours,
    SubmittedAlarmHours,
    LodgedAlarmHours,
    WizardImage
};

using InetFields = std::tuple<Field<std::string, Value<std::string>>, Field<std::string, Value<std::string>>,
                              Field<int, Value<int>>, Field<int, Value<int>>, Field<int, Value<int>>,
                              Field<std::string, Value<std::string>>>;

extern template class VLSERVICE_EXPORT Part<InetFieldIdxs, InetFields>;

/// The part "inet".
class VLSERVICE_EXPORT Inet : public Part<InetFieldIdxs, InetFields> {
public:
    static std::string const PART_NAME;
    static json::RecordKeys const& keys();
    static constexpr int DEF_STATUS_UPDATE_HOURS = 2; ///< when nobody has set them

    Inet(json::Value const& j, bool global, bool sorted);

private:
    static InetFields const FLDS_INIT;
    static std::string const DEF_HELP_URL;
    static std::string const DEF_CONTACT_URL;
    static constexpr int DEF_SUBMITTED_ALARM_HOURS = 4;
    static constexpr int DEF_LODGED_ALARM_HOURS = 168;

    void setGlobalDefs();
};

} // namespace Cfg
