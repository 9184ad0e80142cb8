#include "programs/base/safe_name.h"

#include <string_view>

namespace Base {
namespace {

constexpr std::size_t MAX_BYTES = 200;
constexpr std::string_view FORBIDDEN = "/\\:*?\"<>|";

/// Bytes of the UTF-8 character at the front of `text`, 0 when it is none.
std::size_t characterLength(std::string_view text) {
    auto const lead = static_cast<unsigned char>(text.front());
    std::size_t const length = lead < 0x80   ? 1
                               : lead < 0xC2 ? 0
                               : lead < 0xE0 ? 2
                               : lead < 0xF0 ? 3
                               : lead < 0xF5 ? 4
                                             : 0;
    if (length > text.size())
        return 0;
    for (std::size_t i = 1; i < length; ++i)
        if ((static_cast<unsigned char>(text[i]) & 0xC0) != 0x80)
            return 0;
    return length;
}

bool mayStand(std::string_view character) {
    if (character.size() > 1)
        // U+0080 to U+009F are control characters too.
        return !(character[0] == '\xC2' && static_cast<unsigned char>(character[1]) < 0xA0);
    return static_cast<unsigned char>(character[0]) >= 0x20 && character[0] != 0x7F &&
           FORBIDDEN.find(character[0]) == std::string_view::npos;
}

} // namespace

std::string safeFileName(std::string const& name) {
    std::string safe;
    for (std::string_view rest = name; !rest.empty();) {
        std::size_t const length = characterLength(rest);
        std::string_view const character = rest.substr(0, length ? length : 1);
        bool const leadingDotOrBlank = safe.empty() && (character == "." || character == " ");
        std::string_view const stands = length && mayStand(character) && !leadingDotOrBlank ? character : "_";
        if (safe.size() + stands.size() > MAX_BYTES)
            break;
        safe += stands;
        rest.remove_prefix(character.size());
    }
    return safe.empty() ? "_" : safe;
}

} // namespace Base
