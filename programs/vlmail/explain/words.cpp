#include "programs/vlmail/presets/words.h"
#include "programs/vlmail/explain/words.h"

#include <charconv>
#include <iterator>

namespace VlMail::Words {
namespace {

constexpr char const* MORE = "…";

bool beginsLetter(char byte) { return (static_cast<unsigned char>(byte) & 0xC0) != 0x80; }

} // namespace

std::string shortened(std::string_view text, std::size_t letters) {
    std::string result;
    for (char const c : text) {
        if (beginsLetter(c) && letters-- == 0)
            return result + MORE;
        if (c == '\n')
            result += " / ";
        else
            result += c;
    }
    return result;
}

std::string excerpt(std::string_view text, std::size_t letters) { return inQuotes(shortened(text, letters)); }

std::string millimetres(long long hundredths) {
    return number(static_cast<double>(hundredths) / 100) + " mm";
}

std::string number(double value) {
    char buffer[64];
    auto const end = std::to_chars(std::begin(buffer), std::end(buffer), value).ptr;
    return std::string(buffer, end);
}

} // namespace VlMail::Words
