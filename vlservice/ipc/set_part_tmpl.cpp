#include "vlservice/ipc/set_part_tmpl.h"

namespace Ipc {

template class SetPartTmpl<Cfg::App, 10>;
template class SetPartTmpl<Cfg::Inet, 12>;
template class SetPartTmpl<Cfg::Presets, 13>;
template class SetPartTmpl<Cfg::Profiles, 14>;
template class SetPartTmpl<Cfg::PO, 15>;
template class SetPartTmpl<Cfg::Departments, 16>;

} // namespace Ipc
