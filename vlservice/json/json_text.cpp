#include "vlservice/json/json_text.h"

#include <algorithm>
#include <charconv>
#include <cstddef>
#include <cstdlib>
#include <locale>
#include <memory>
#include <new>
#include <ostream>
#include <sstream>
#include <string_view>

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

/// Of the character that the bytes begin with; 0 when they begin with none.
std::size_t lengthOfCharacter(std::string_view bytes) {
    auto const byte = [&](std::size_t i) {
        return i < bytes.size() ? static_cast<unsigned char>(bytes[i]) : 0U;
    };
    unsigned const lead = byte(0);
    if (lead < 0x80)
        return 1;
    if (lead < 0xC2 || lead > 0xF4)
        return 0;
    std::size_t const length = lead < 0xE0 ? 2 : lead < 0xF0 ? 3 : 4;
    for (std::size_t i = 1; i < length; ++i)
        if ((byte(i) & 0xC0) != 0x80)
            return 0;
    bool const isTooLong = (lead == 0xE0 && byte(1) < 0xA0) || (lead == 0xF0 && byte(1) < 0x90);
    bool const isNoCharacter = (lead == 0xED && byte(1) >= 0xA0) || (lead == 0xF4 && byte(1) >= 0x90);
    return isTooLong || isNoCharacter ? 0 : length;
}

/// As jansson takes it, which does not say whether memory or the text was at fault.
bool isUtf8(std::string_view text) {
    while (!text.empty()) {
        std::size_t const length = lengthOfCharacter(text);
        if (length == 0)
            return false;
        text.remove_prefix(length);
    }
    return true;
}

bool holdsOnlyUtf8(Value const& value) {
    if (value.isString())
        return isUtf8({json_string_value(value.node()), json_string_length(value.node())});
    if (value.isObject())
        for (auto const& [key, member] : value.toObject())
            if (!holdsOnlyUtf8(member))
                return false;
    if (value.isArray())
        for (Value const& element : value.toArray())
            if (!holdsOnlyUtf8(element))
                return false;
    return true;
}

/// Tests the keys, which the printer of jansson lets through as malformed text, and finds the digits that are
/// needed.
int prepare(Value const& value) {
    int digits = DIGITS_FOR_PEOPLE;
    if (value.isObject()) {
        for (auto const& [key, member] : value.toObject()) {
            if (!isUtf8(key))
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
    if (!text && holdsOnlyUtf8(value))
        throw std::bad_alloc();
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
