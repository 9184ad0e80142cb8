#include "vlservice/cfg/app.h"

namespace Cfg {

template class Part<AppFieldIdxs, AppFields>;

std::string const App::PART_NAME = "app";

ShowCtrls const App::DEF_SHOW_CTRLS(ShowCtrls::Bits().set());

AppFields const App::FLDS_INIT{{"show_ctrls", RootDefault{DEF_SHOW_CTRLS}},
                               {"priority_delivery"},
                               {"db_name"},
                               {"db_host"},
                               {"print_area", RootDefault{DEF_PRN_AREA}},
                               {"descr"},
                               {"dep_alias"},
                               {"auto_save_preset", RootDefault{DEF_AUTO_SAVE_PRESET}},
                               {"max_letter_sheets", RootDefault{DEF_MAX_LETTER_SHEETS}},
                               // The odd spelling is the interface's: every stored document has it.
                               {"enfoce_dep"},
                               {"enforce_po"},
                               {"enforce_profile"},
                               {"loose_letter_deviation"},
                               {"debug_view"},
                               {"m"}};

json::RecordKeys const& App::keys() {
    static json::RecordKeys const keys = keysOf(FLDS_INIT);
    return keys;
}

App::App() : Part(false, FLDS_INIT) { setOwn<AppFieldIdxs::M>(0); }

App::App(json::Value const& j, bool global, bool sorted) : Part(global, FLDS_INIT) {
    deserialize(j, sorted);
    if (global)
        setGlobalDefs();
}

std::string App::getDescription() const {
    return isInherited<AppFieldIdxs::Descr>() ? std::string() : value<AppFieldIdxs::Descr>();
}

void App::setGlobalDefs() { takeRootDefaults(); }

} // namespace Cfg
