#pragma once
// Lower case as the process's locale has it, byte by byte: names of fields and of months.

#include <algorithm>
#include <cctype>
#include <string>

namespace Cfg {

inline std::string lowerCase(std::string text) {
    std::transform(text.begin(), text.end(), text.begin(),
                   [](unsigned char byte) { return static_cast<char>(std::tolower(byte)); });
    return text;
}

} // namespace Cfg
