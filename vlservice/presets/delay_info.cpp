#include "vlservice/json/json_form.h"
#include "vlservice/json/json_record.h"
#include "vlservice/presets/pack_preset.h"

#include <tuple>

namespace Cfg {

/// Strict, unlike plain numbers: a delay that cannot be read must not become none.
template<>
struct JsonForm<std::set<int>> {
    static std::set<int> read(json::Value const& node) { return PackPreset::DelayInfo::jArrToInts(node); }
    static json::Value write(std::set<int> const& numbers) {
        json::Array array;
        for (int const number : numbers)
            array.append(number);
        return array;
    }
};

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
