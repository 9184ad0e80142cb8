#include "programs/base/one_line.h"

#include "vlservice/json/json.h"

#include <algorithm>

namespace Base {
namespace {

constexpr std::size_t MAX_LINE_BYTES = 500;

bool isControl(unsigned char c) { return c < 0x20 || c == 0x7F; }

bool isUtf8(std::string const& text) {
    return static_cast<bool>(json::Value(json_stringn(text.data(), text.size())));
}

/// Cuts in front of the character that the limit falls into.
std::string cut(std::string text) {
    if (text.size() <= MAX_LINE_BYTES)
        return text;
    std::size_t end = MAX_LINE_BYTES;
    while (end > 0 && (static_cast<unsigned char>(text[end]) & 0xC0) == 0x80)
        --end;
    text.resize(end);
    return text;
}

} // namespace

std::string oneLine(std::string const& text) {
    std::string line = cut(text);
    std::replace_if(line.begin(), line.end(), isControl, ' ');
    if (!isUtf8(line))
        std::replace_if(
            line.begin(), line.end(), [](unsigned char c) { return c >= 0x80; }, '?');
    return line;
}

bool isPlainText(std::string const& text, std::size_t maxBytes) {
    return text.size() <= maxBytes && std::none_of(text.begin(), text.end(), isControl) && isUtf8(text);
}

} // namespace Base
