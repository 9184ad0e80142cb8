#include "programs/vlmail/explain/words.h"
#include "programs/base/millimetres.h"
#include "programs/base/quoting.h"
#include "programs/base/utf8.h"

#include <charconv>
#include <iterator>

namespace VlMail::Words {
namespace {

constexpr char const* MORE = "…";

} // namespace

std::string shortened(std::string_view text, std::size_t letters) {
    std::string_view const shown = Base::firstCharacters(text, letters);
    std::string result;
    for (char const c : shown)
        result += c == '\n' ? " / " : std::string(1, c);
    return shown.size() < text.size() ? result + MORE : result;
}

std::string excerpt(std::string_view text, std::size_t letters) {
    return Base::inQuotes(shortened(text, letters));
}

std::string millimetres(long long hundredths) { return Base::withMillimetres(hundredths); }

std::string number(double value) {
    char buffer[64];
    auto const end = std::to_chars(std::begin(buffer), std::end(buffer), value).ptr;
    return std::string(buffer, end);
}

} // namespace VlMail::Words
