#include "vlservice/json/json_text.h"

#include <algorithm>
#include <charconv>
#include <cstdlib>
#include <locale>
#include <memory>
#include <ostream>
#include <sstream>

namespace json {
namespace {

/// Digits that every finite real in a document survives; 15 for most, and then they read as people wrote
/// them.
constexpr int DIGITS_FOR_PEOPLE = 15;
constexpr int DIGITS_EXACT = 17;

bool survives(double real, int digits) {
    char text[64];
    auto const printed = std::to_chars(text, text + sizeof text, real, std::chars_format::general, digits);
    double back = 0;
    std::from_chars(text, printed.ptr, back);
    return back == real;
}

/// Tests the keys, which the printer of jansson lets through as malformed text, and finds the digits that are
/// needed.
int prepare(Value const& value) {
    int digits = DIGITS_FOR_PEOPLE;
    if (value.isObject()) {
        for (auto const& [key, member] : value.toObject()) {
            if (!Value(json_string(key)))
                throw Exc("JSON error: a key that is not valid UTF-8 cannot be printed");
            digits = std::max(digits, prepare(member));
        }
    } else if (value.isArray()) {
        for (Value const& element : value.toArray())
            digits = std::max(digits, prepare(element));
    } else if (value.isReal() && !survives(value.toReal(), DIGITS_FOR_PEOPLE)) {
        digits = DIGITS_EXACT;
    }
    return digits;
}

using CText = std::unique_ptr<char, decltype(&std::free)>;

CText compact(Value const& value) {
    std::size_t const flags = JSON_COMPACT | JSON_ENCODE_ANY | JSON_REAL_PRECISION(prepare(value));
    CText text(json_dumps(value.node(), flags), std::free);
    if (!text)
        throw Exc("JSON error: a text that is not valid UTF-8 cannot be printed");
    return text;
}

std::ostream& print(std::ostream& out, Value const& container) {
    if (!container)
        throw Exc("JSON error: an empty handle cannot be printed");
    return out << compact(container).get();
}

/// Numbers for people do not follow the stream's or the process's locale.
template<typename Number>
std::ostream& printNumber(std::ostream& out, Number number) {
    std::ostringstream text;
    text.imbue(std::locale::classic());
    text << number;
    return out << text.str();
}

} // namespace

Object strToObject(char const* text, std::size_t length) {
    json_error_t error;
    Value parsed(json_loadb(text, length, 0, &error));
    if (!parsed) {
        std::ostringstream message;
        message.imbue(std::locale::classic());
        message << "JSON error: " << error.text << " (line " << error.line << ", column " << error.column
                << ')';
        throw Exc(message.str());
    }
    return std::move(parsed).toObject();
}

std::ostream& operator<<(std::ostream& out, Object const& object) { return print(out, object); }

std::ostream& operator<<(std::ostream& out, Array const& array) { return print(out, array); }

std::ostream& operator<<(std::ostream& out, Value const& value) {
    if (!value)
        return out << "#absent#";
    switch (json_typeof(value.node())) {
    case JSON_OBJECT:
    case JSON_ARRAY:
        return print(out, value);
    case JSON_STRING:
        return out << '"' << value.toString() << '"';
    case JSON_INTEGER:
        return printNumber(out, value.toInt());
    case JSON_REAL:
        return printNumber(out, value.toReal());
    case JSON_TRUE:
        return out << "true";
    case JSON_FALSE:
        return out << "false";
    case JSON_NULL:
        break;
    }
    return out << "null";
}

std::string toText(Value const& value) { return value ? compact(value).get() : std::string(); }

} // namespace json
