#include "programs/base/safe_name.h"

#include "programs/base/plain_text.h"
#include "programs/base/utf8.h"

#include <string_view>

namespace Base {
namespace {

constexpr std::size_t MAX_BYTES = 200;
constexpr std::u32string_view FORBIDDEN = U"/\\:*?\"<>|";

bool mayStand(char32_t character) {
    return character != NO_CHARACTER && !isControl(character) &&
           FORBIDDEN.find(character) == std::u32string_view::npos;
}

bool mayLead(char32_t character) { return character != U'.' && character != U' '; }

} // namespace

std::string safeFileName(std::string const& name) {
    std::string safe;
    for (std::size_t at = 0; at < name.size();) {
        std::size_t const begin = at;
        char32_t const character = nextCharacter(name, at);
        bool const stands = mayStand(character) && (begin > 0 || mayLead(character));
        std::string const written = stands ? name.substr(begin, at - begin) : "_";
        if (safe.size() + written.size() > MAX_BYTES)
            break;
        safe += written;
    }
    return safe.empty() ? "_" : safe;
}

} // namespace Base
