#include "vlservice/cfg/profiles.h"

namespace Cfg {
namespace {

constexpr char const* NAME_KEY = "name";
constexpr char const* DESCRIPTION_KEY = "descrip";

} // namespace

Profile::Profile(json::Object const& object)
    : name_(object.get(NAME_KEY).toString()), descr_(object.get(DESCRIPTION_KEY).textOrEmpty()) {}

json::Object Profile::serialize() const {
    json::Object object{{NAME_KEY, name_}};
    if (!descr_.empty())
        object.set(DESCRIPTION_KEY, descr_);
    return object;
}

template class Part<ProfFieldIdxs, ProfFields>;

std::string const Profiles::PART_NAME = "profiles";

ProfFields const Profiles::FLDS_INIT{"vals"};

Profiles::Profiles(json::Value const& j, bool global, bool sorted) : Part(global, FLDS_INIT) {
    deserialize(j, sorted);
}

} // namespace Cfg
