#include "vlservice/cfg/profiles.h"

#include "vlservice/json/json_record.h"

namespace Cfg {

struct Profile::Keys {
    static constexpr std::tuple TABLE{
        json::Required{"name", &Profile::name_},
        json::Key{"descrip", &Profile::descr_},
    };
};

Profile::Profile(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }

json::Object Profile::serialize() const {
    json::Object object;
    json::writeKeys(Keys::TABLE, *this, object);
    return object;
}

json::RecordKeys const& Profile::keys() {
    static json::RecordKeys const keys{json::describeKeys(Keys::TABLE)};
    return keys;
}

template class Part<ProfFieldIdxs, ProfFields>;

std::string const Profiles::PART_NAME = "profiles";

ProfFields const Profiles::FLDS_INIT{"vals"};

json::RecordKeys const& Profiles::keys() {
    static json::RecordKeys const keys = keysOf(FLDS_INIT);
    return keys;
}

Profiles::Profiles(json::Value const& j, bool global, bool sorted) : Part(global, FLDS_INIT) {
    deserialize(j, sorted);
}

} // namespace Cfg
