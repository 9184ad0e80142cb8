#include "vlservice/json/json_record.h"
#include "vlservice/presets/pack_preset.h"

#include <tuple>

/// Strict, unlike plain numbers: a delay that cannot be read must not become none.
template<>
struct json::Form<std::set<int>> {
    static std::set<int> read(Value const& node) { return Cfg::PackPreset::DelayInfo::jArrToInts(node); }
    static Value write(std::set<int> const& numbers) {
        Array array;
        for (int const number : numbers)
            array.append(number);
        return array;
    }
    static KeyForm describe() { return {KeyType::Numbers}; }
};

namespace Cfg {
namespace {

using DelayInfo = PackPreset::DelayInfo;

constexpr std::tuple TABLE{
    json::Key{"count", &DelayInfo::count},
    json::Key{"week_days", &DelayInfo::weekDays},
    json::Key{"month_days", &DelayInfo::monthDays},
    json::Key{"mins", &DelayInfo::mins},
};

} // namespace

PackPreset::DelayInfo::DelayInfo(json::Object const& object) { json::readKeys(TABLE, object, *this); }

json::Object PackPreset::DelayInfo::serialize() const {
    json::Object object;
    json::writeKeys(TABLE, *this, object);
    return object;
}

json::RecordKeys const& PackPreset::DelayInfo::keys() {
    static json::RecordKeys const keys{json::describeKeys(TABLE)};
    return keys;
}

std::set<int> PackPreset::DelayInfo::jArrToInts(json::Value const& value) {
    std::set<int> numbers;
    if (!value)
        return numbers;
    for (json::Value const& number : value.toArray())
        numbers.insert(static_cast<int>(number.toInt()));
    return numbers;
}

} // namespace Cfg
