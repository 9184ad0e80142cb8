#include "programs/base/utf8.h"

#include <unicode/utf8.h>

#include <cstdint>

namespace Base {
namespace {

constexpr char32_t REPLACEMENT = 0xFFFD;
/// Bytes of the longest character.
constexpr std::size_t LONGEST = 4;

} // namespace

char32_t nextCharacter(std::string_view text, std::size_t& at) {
    // A window, since ICU counts in 32 bits; its end is far enough for any character.
    std::string_view const rest = text.substr(at, LONGEST);
    std::int32_t step = 0;
    UChar32 character = 0;
    U8_NEXT(rest.data(), step, static_cast<std::int32_t>(rest.size()), character);
    at += static_cast<std::size_t>(step);
    return character < 0 ? NO_CHARACTER : static_cast<char32_t>(character);
}

bool isUtf8(std::string_view text) {
    for (std::size_t at = 0; at < text.size();)
        if (nextCharacter(text, at) == NO_CHARACTER)
            return false;
    return true;
}

std::string validUtf8(std::string_view text) {
    std::string valid;
    valid.reserve(text.size());
    for (std::size_t at = 0; at < text.size();) {
        std::size_t const begin = at;
        if (nextCharacter(text, at) == NO_CHARACTER)
            appendCharacter(valid, REPLACEMENT);
        else
            valid += text.substr(begin, at - begin);
    }
    return valid;
}

std::size_t characterCount(std::string_view text) {
    std::size_t count = 0;
    for (std::size_t at = 0; at < text.size(); ++count)
        nextCharacter(text, at);
    return count;
}

std::string_view firstCharacters(std::string_view text, std::size_t count) {
    std::size_t at = 0;
    for (; count > 0 && at < text.size(); --count)
        nextCharacter(text, at);
    return text.substr(0, at);
}

std::string_view firstBytes(std::string_view text, std::size_t maxBytes) {
    while (maxBytes < text.size() && !isBetweenCharacters(text, maxBytes))
        --maxBytes;
    return text.substr(0, maxBytes);
}

bool isBetweenCharacters(std::string_view text, std::size_t at) {
    if (at == 0 || at >= text.size())
        return true;
    std::size_t const windowAt = at < LONGEST ? 0 : at - LONGEST + 1;
    std::string_view const window = text.substr(windowAt, 2 * LONGEST);
    auto start = static_cast<std::int32_t>(at - windowAt);
    auto const* const bytes = reinterpret_cast<std::uint8_t const*>(window.data());
    auto const asked = start;
    U8_SET_CP_START(bytes, 0, start);
    return start == asked;
}

void appendCharacter(std::string& text, char32_t character) {
    char bytes[U8_MAX_LENGTH];
    std::int32_t length = 0;
    U8_APPEND_UNSAFE(bytes, length, character);
    text.append(bytes, static_cast<std::size_t>(length));
}

} // namespace Base
