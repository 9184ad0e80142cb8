#include "programs/base/utf8.h"

#include <unicode/unistr.h>

#include <algorithm>

namespace Base {

std::string validUtf8(std::string const& text) {
    std::string valid;
    icu::UnicodeString::fromUTF8(text).toUTF8String(valid);
    return valid;
}

std::string onOneLine(std::string text) {
    std::replace_if(
        text.begin(), text.end(), [](unsigned char c) { return c < 0x20 || c == 0x7F; }, ' ');
    return text;
}

} // namespace Base
