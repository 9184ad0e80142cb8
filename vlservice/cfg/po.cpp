#include "vlservice/cfg/po.h"

namespace Cfg {

template class Part<POFieldIdxs, POFields>;

std::string const PO::PART_NAME = "po";

POFields const PO::FLDS_INIT{"code", "expiry"};

json::RecordKeys const& PO::keys() {
    static json::RecordKeys const keys = keysOf(FLDS_INIT);
    return keys;
}

PO::PO(json::Value const& j, bool global, bool sorted) : Part(global, FLDS_INIT) { deserialize(j, sorted); }

} // namespace Cfg
