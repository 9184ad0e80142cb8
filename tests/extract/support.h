#pragma once
// What the tests of definitions, zones and presets share.

#include "tests/support/json_helpers.h"
#include "tests/support/log_lines.h"
#include "tests/support/time_zone.h"
#include "vlservice/extract/extract_field.h"

#include <gmock/gmock.h>

#include <cstdlib>
#include <ctime>
#include <memory>
#include <ostream>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

inline long long utc(int year, int month, int day, int hour = 0, int minute = 0, int second = 0) {
    std::tm time{};
    time.tm_year = year - 1900;
    time.tm_mon = month - 1;
    time.tm_mday = day;
    time.tm_hour = hour;
    time.tm_min = minute;
    time.tm_sec = second;
    return timegm(&time);
}

namespace Cfg {

/// A definition named "f" with further keys, given as the inside of a JSON object.
inline ExtractField definition(std::string const& keys) {
    return ExtractField(parse(R"({"name":"f")" + (keys.empty() ? "" : "," + keys) + "}"));
}

/// What a validation makes of a text: the state and the value.
struct Typed {
    ExtractedField::ValueType state;
    json::Value value;

    friend bool operator==(Typed const&, Typed const&) = default;
    friend std::ostream& operator<<(std::ostream& out, Typed const& typed) {
        return out << "state " << int(typed.state) << ", " << typed.value;
    }
};

inline Typed plain(json::Value const& value) { return {ExtractedField::ValueType::Plain, value}; }
inline Typed date(long long seconds) { return {ExtractedField::ValueType::Time, seconds}; }
inline Typed invalid(std::string const& text) { return {ExtractedField::ValueType::Invalid, text}; }

inline Typed typed(ExtractedField const& field) { return {field.valueType(), field.rawValue()}; }

inline ExtractedField rawValue(json::Value const& value) {
    return {"f", value, 0, false, IgnoreOnGroup::MustMatch, ExtractedField::ValueType::NotValidated};
}

inline Typed validate(ExtractField const& definition, std::string const& text) {
    ExtractedField value = rawValue(text);
    definition.validate(value);
    return typed(value);
}

} // namespace Cfg
