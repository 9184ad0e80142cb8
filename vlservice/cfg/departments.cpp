#include "vlservice/cfg/departments.h"

namespace Cfg {
namespace {

constexpr char const* NAME_KEY = "name";
constexpr char const* DESCRIPTION_KEY = "descrip";

} // namespace

Department Department::read(json::Value const& node) {
    if (!node.isObject())
        return {node.toString(), {}};
    json::Object const& object = node.toObject();
    return {object.get(NAME_KEY).toString(), object.get(DESCRIPTION_KEY).textOrEmpty()};
}

std::string Department::valForUI() const {
    return description_.empty() ? name_ : name_ + " = " + description_;
}

json::Value Department::serialize() const {
    if (description_.empty())
        return name_;
    return json::Object{{NAME_KEY, name_}, {DESCRIPTION_KEY, description_}};
}

template class Part<DepFieldIdxs, DepFields>;

std::string const Departments::PART_NAME = "deps";

DepFields const Departments::FLDS_INIT{"vals"};

Departments::Departments(json::Value const& j, bool global, bool sorted) : Part(global, FLDS_INIT) {
    deserialize(j, sorted);
}

} // namespace Cfg
