#pragma once
// JSON in tests: written and printed as text.

#include "vlservice/json/json_text.h"

#include <gmock/gmock.h>

#include <sstream>
#include <string>

inline json::Object parse(std::string const& text) { return json::strToObject(text.data(), text.size()); }

/// The value of any JSON text; the empty text is the empty handle.
inline json::Value valueOf(std::string const& text) {
    return text.empty() ? json::Value() : parse("{\"v\":" + text + "}").get("v");
}

/// The form for people, which for objects and arrays is compact JSON.
inline std::string print(json::Value const& value) {
    std::ostringstream text;
    text << value;
    return text.str();
}

template<typename Exception, typename Call>
void expectFailure(Call call, std::string const& message) {
    EXPECT_THAT(call, testing::ThrowsMessage<Exception>(testing::StrEq(message)));
}

template<typename Call>
void expectWrongType(Call call, std::string const& actual, std::string const& wanted) {
    expectFailure<json::Exc>(call, "JSON error: Wrong type: " + actual + ". Expected type: " + wanted);
}
