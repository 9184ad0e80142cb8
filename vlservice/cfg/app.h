#pragma once
// The settings that steer the application as a whole.

#include "vlservice/cfg/geometry.h"
#include "vlservice/cfg/part.h"
#include "vlservice/cfg/show_ctrls.h"
#include "vlservice/export.h"

#include <cstdint>
#include <string>
#include <tuple>

namespace Cfg {

/// Carried as it is; its values belong to the service and the user interface.
enum class VLSERVICE_EXPORT PriorityDelivery : std::int32_t { Default = 0 };

enum class VLSERVICE_EXPORT AppFieldIdxs {
    ShowCtrls,
    PriorityDelivery,
    DbName,
    DbHost,
    PrintArea,
    Descr,
    DepAlias,
    AutoSavePreset,
    MaxLetterSheets,
    EnforceDep,
    EnforcePo,
    EnforceProfile,
    LooseLetterDeviation,
    DebugView,
    M
};

using AppFields =
    std::tuple<Field<ShowCtrls, Value<ShowCtrls>>, Field<PriorityDelivery, Value<PriorityDelivery>>,
               Field<std::string, Value<std::string>>, Field<std::string, Value<std::string>>,
               Field<Rect, Value<Rect>>, Field<std::string, Value<std::string>>,
               Field<std::string, Value<std::string>>, Field<bool, Value<bool>>, Field<int, Value<int>>,
               Field<bool, Value<bool>>, Field<bool, Value<bool>>, Field<bool, Value<bool>>,
               Field<bool, Value<bool>>, Field<int, Value<int>>, Field<int, Value<int>>>;

extern template class VLSERVICE_EXPORT Part<AppFieldIdxs, AppFields>;

/// The part "app". The library reads, completes and writes these values and interprets none of them.
class VLSERVICE_EXPORT App : public Part<AppFieldIdxs, AppFields> {
public:
    static std::string const PART_NAME;
    static json::RecordKeys const& keys();

    /// Everything is inherited but "m", which is an own 0.
    App();
    App(json::Value const& j, bool global, bool sorted);

    /// The own description; the empty text when it is inherited, whatever the inherited value.
    std::string getDescription() const;

private:
    static AppFields const FLDS_INIT;
    static ShowCtrls const DEF_SHOW_CTRLS;
    static constexpr Rect DEF_PRN_AREA{300, 300, 20700, 29300};
    static constexpr bool DEF_AUTO_SAVE_PRESET = true;
    static constexpr int DEF_MAX_LETTER_SHEETS = 999;

    void setGlobalDefs();
};

} // namespace Cfg
