#include "vlservice/cfg/json_record.h"
#include "vlservice/presets/pack_preset.h"

#include <tuple>

namespace json {

/// Strict, unlike other defaults: a delay that cannot be read must not become none.
template<>
struct Form<std::set<int>> {
    static std::set<int> read(Value const& value, std::set<int> const&) {
        return Cfg::PackPreset::DelayInfo::jArrToInts(value);
    }
    static Value write(std::set<int> const& numbers) {
        Array array;
        for (int const number : numbers)
            array.append(number);
        return array;
    }
};

} // namespace json

namespace Cfg {
namespace {

using DelayInfo = PackPreset::DelayInfo;

constexpr std::tuple KEYS{
    json::Key{"count", &DelayInfo::count},
    json::Key{"week_days", &DelayInfo::weekDays},
    json::Key{"month_days", &DelayInfo::monthDays},
    json::Key{"mins", &DelayInfo::mins},
};

} // namespace

PackPreset::DelayInfo::DelayInfo(json::Object const& object) { json::readKeys(KEYS, object, *this); }

json::Object PackPreset::DelayInfo::serialize() const {
    json::Object object;
    json::writeKeys(KEYS, *this, object);
    return object;
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
