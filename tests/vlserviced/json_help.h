#pragma once
// JSON as text, both ways, for short tests.

#include "vlservice/json/json_text.h"

#include <sstream>
#include <string>

inline json::Object parse(std::string const& text) { return json::strToObject(text.data(), text.size()); }

inline std::string print(json::Value const& value) {
    std::ostringstream text;
    text << value;
    return text.str();
}
