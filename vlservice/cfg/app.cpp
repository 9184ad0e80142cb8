#include "vlservice/cfg/app.h"

namespace Cfg {

template class Part<AppFieldIdxs, AppFields>;

std::string const App::PART_NAME = "app";

AppFields const App::FLDS_INIT{"show_ctrls", "priority_delivery", "db_name", "db_host", "print_area", "descr",
                               "dep_alias", "auto_save_preset", "max_letter_sheets",
                               // The odd spelling is the interface's: every stored document has it.
                               "enfoce_dep", "enforce_po", "enforce_profile", "loose_letter_deviation",
                               "debug_view", "m"};

App::App() : Part(false, FLDS_INIT) { setOwn<AppFieldIdxs::M>(0); }

App::App(json::Value const& j, bool global, bool sorted) : Part(global, FLDS_INIT) {
    deserialize(j, sorted);
    if (global)
        setGlobalDefs();
}

std::string App::getDescription() const {
    return isInherited<AppFieldIdxs::Descr>() ? std::string() : value<AppFieldIdxs::Descr>();
}

void App::setGlobalDefs() {
    using enum AppFieldIdxs;
    setDefaultIfInherited<ShowCtrls>(Cfg::ShowCtrls(Cfg::ShowCtrls::Bits().set()));
    setDefaultIfInherited<PrintArea>(DEF_PRN_AREA);
    setDefaultIfInherited<AutoSavePreset>(true);
    setDefaultIfInherited<MaxLetterSheets>(DEF_MAX_LETTER_SHEETS);
}

} // namespace Cfg
