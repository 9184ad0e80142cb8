#pragma once
// A set of varied letters, each with two presets and with what they should find: one as a person writes it
// who looks at the page for the first time, one as somebody does who measures where each value stands. Six
// languages, and in each of them seven ways to set a letter.

#include "vlservice/json/json.h"

#include <map>
#include <string>
#include <vector>

namespace LetterSet {

struct Letter {
    /// Of its file.
    std::string name;
    std::string pdf;
    json::Object plainPreset;
    json::Object measuredPreset;
    json::Object packPreset;
    /// By the names of fields; dates as seconds.
    std::map<std::string, json::Value> expected;
};

std::vector<Letter> all();

} // namespace LetterSet
