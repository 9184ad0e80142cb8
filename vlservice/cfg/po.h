#pragma once
// A purchase order's code and its expiry.

#include "vlservice/cfg/part.h"
#include "vlservice/export.h"

#include <string>
#include <tuple>

namespace Cfg {

enum class VLSERVICE_EXPORT POFieldIdxs { Code, Expiry };

using POFields = std::tuple<Field<std::string, Value<std::string>>, Field<long long, Value<long long>>>;

extern template class VLSERVICE_EXPORT Part<POFieldIdxs, POFields>;

/// The part "po".
class VLSERVICE_EXPORT PO : public Part<POFieldIdxs, POFields> {
public:
    static std::string const PART_NAME;
    static json::RecordKeys const& keys();

    PO(json::Value const& j, bool global, bool sorted);

private:
    static POFields const FLDS_INIT;
};

} // namespace Cfg
