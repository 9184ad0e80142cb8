#pragma once
// JSON in tests: documents as literals, their compact text, and the message of a failure.

#include "vlservice/json/json.h"
#include "vlservice/json/json_text.h"

#include <cstddef>
#include <sstream>
#include <stdexcept>
#include <string>

namespace VLServiceTest {

/// Any JSON value, not only an object.
inline json::Value operator""_json(char const* text, std::size_t length) {
    json_error_t error;
    json::Value value(json_loadb(text, length, JSON_DECODE_ANY, &error));
    if (!value)
        throw std::logic_error(std::string("The test's JSON is bad: ") + error.text);
    return value;
}

/// Compact; "#absent#" for the empty handle.
inline std::string text(json::Value const& value) {
    std::ostringstream out;
    out << value;
    return out.str();
}

/// The text of the exception of exactly this type that the operation throws.
template<typename Exception = json::Exc, typename Operation>
std::string messageOf(Operation operation) {
    try {
        operation();
    } catch (Exception const& e) {
        return typeid(e) == typeid(Exception) ? e.what() : std::string("another type: ") + e.what();
    }
    return "nothing was thrown";
}

} // namespace VLServiceTest
