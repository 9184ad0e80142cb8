#include "programs/reader/address_text.h"

#include "programs/base/utf8.h"
#include "programs/patterns/pattern.h"

#include <algorithm>
#include <string>
#include <vector>

namespace Reader {
namespace {

std::vector<std::string_view> linesOf(std::string_view text) {
    std::vector<std::string_view> lines;
    for (std::size_t begin = 0; begin < text.size();) {
        std::size_t const end = std::min(text.find('\n', begin), text.size());
        lines.push_back(text.substr(begin, end - begin));
        begin = end + 1;
    }
    return lines;
}

/// A postcode and a town, in the orders that countries have.
bool isTown(std::string_view line) {
    static Patterns::Pattern const POSTCODE_FIRST(
        R"((\u{1,3}[- ])?(\d{4,5}|\d{2,4}[- ]\d{2,3})( \u{2})? \u[^\d]*( \d{1,2})?)",
        Patterns::Pattern::Use::Validate);
    static Patterns::Pattern const POSTCODE_LAST(
        R"((.* )?\u{1,2}\d[\u\d]? ?\d\u{2}|\u[^\d]*,? \u{2} \d{5}(-\d{4})?)",
        Patterns::Pattern::Use::Validate);
    return POSTCODE_FIRST.fits(line) == Patterns::Pattern::Answer::Yes ||
           POSTCODE_LAST.fits(line) == Patterns::Pattern::Answer::Yes;
}

bool hasDigit(std::string_view line) { return line.find_first_of("0123456789") != line.npos; }

/// Letters, and the number of a house or of a box.
bool isStreet(std::string_view line) {
    auto const isAlphabetic = [](unsigned char c) {
        return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c >= 0x80;
    };
    return hasDigit(line) && std::count_if(line.begin(), line.end(), isAlphabetic) >= 3;
}

} // namespace

bool isProse(std::string_view text) {
    std::vector<std::string_view> const lines = linesOf(text);
    return std::any_of(lines.begin(), lines.end(),
                       [](std::string_view line) { return Base::characterCount(line) > MAX_ADDRESS_LINE; });
}

bool looksLikePostalAddress(std::string_view text) {
    constexpr std::size_t FEWEST = 3;
    constexpr std::size_t MOST = 9;
    std::vector<std::string_view> const lines = linesOf(text);
    if (lines.size() < FEWEST || lines.size() > MOST || isProse(text) || hasDigit(lines.front()))
        return false;
    auto const town = std::find_if(lines.begin(), lines.end(), isTown);
    return std::count_if(lines.begin(), lines.end(), isTown) == 1 && lines.end() - town <= 2 &&
           std::any_of(lines.begin() + 1, town, isStreet);
}

} // namespace Reader
