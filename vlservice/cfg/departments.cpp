#include "vlservice/cfg/departments.h"

#include "vlservice/json/json_record.h"

namespace Cfg {

struct Department::Keys {
    static constexpr std::tuple TABLE{
        json::Required{"name", &Department::name_},
        json::Key{"descrip", &Department::description_},
    };
};

json::RecordKeys const& Department::keys() {
    static json::RecordKeys const keys{.rows = json::describeKeys(Keys::TABLE), .mayBeText = true};
    return keys;
}

Department Department::read(json::Value const& node) {
    if (!node.isObject())
        return {node.toString(), {}};
    Department department;
    json::readKeys(Keys::TABLE, node.toObject(), department);
    return department;
}

std::string Department::valForUI() const {
    return description_.empty() ? name_ : name_ + " = " + description_;
}

json::Value Department::serialize() const {
    if (description_.empty())
        return name_;
    json::Object object;
    json::writeKeys(Keys::TABLE, *this, object);
    return object;
}

template class Part<DepFieldIdxs, DepFields>;

std::string const Departments::PART_NAME = "deps";

DepFields const Departments::FLDS_INIT{"vals"};

json::RecordKeys const& Departments::keys() {
    static json::RecordKeys const keys = keysOf(FLDS_INIT);
    return keys;
}

Departments::Departments(json::Value const& j, bool global, bool sorted) : Part(global, FLDS_INIT) {
    deserialize(j, sorted);
}

} // namespace Cfg
