#include "programs/reader/number_reading.h"

#include "programs/base/utf8.h"

#include "vlservice/json/json_text.h"

#include <unicode/uchar.h>

#include <algorithm>
#include <optional>
#include <sstream>
#include <string_view>

namespace Reader {
namespace {

using Text = std::u32string;

Text decoded(std::string_view utf8) {
    Text points;
    for (std::size_t at = 0; at < utf8.size();)
        points += Base::nextCharacter(utf8, at);
    return points;
}

int digitOf(char32_t c) { return u_charDigitValue(static_cast<UChar32>(c)); }
bool isDigit(char32_t c) { return digitOf(c) >= 0; }
bool isMinus(char32_t c) { return c == U'-' || c == U'\u2212' || c == U'\u2013'; }
bool isBlank(char32_t c) { return u_isUWhiteSpace(static_cast<UChar32>(c)); }

/// The ways to write one separator: a blank may be a narrow one, an apostrophe a curved one.
char32_t plainSeparator(char32_t c) {
    if (isBlank(c))
        return U' ';
    return c == U'\u2019' || c == U'\u02BC' ? U'\'' : c;
}

/// A text cut into what stands around its digits and what goes from the first to the last of them.
struct Parts {
    Text front;
    Text number;
    Text end;
};

std::optional<Parts> partsOf(Text const& text) {
    auto const first = std::find_if(text.begin(), text.end(), isDigit);
    if (first == text.end())
        return std::nullopt;
    auto const last = std::find_if(text.rbegin(), text.rend(), isDigit).base();
    return Parts{Text(text.begin(), first), Text(first, last), Text(last, text.end())};
}

/// Whether nothing stands there but a sign, brackets and one short word or sign of a currency.
bool isBesideNumber(Text const& text) {
    constexpr std::ptrdiff_t LONGEST_CURRENCY = 5;
    constexpr std::u32string_view ALLOWED = U"+()[].,:*=%";
    auto const isAlphabetic = [](char32_t c) { return u_isalpha(static_cast<UChar32>(c)); };
    return std::count_if(text.begin(), text.end(), isAlphabetic) <= LONGEST_CURRENCY &&
           std::all_of(text.begin(), text.end(), [&](char32_t c) {
               return isAlphabetic(c) || isBlank(c) || isMinus(c) || ALLOWED.find(c) != ALLOWED.npos ||
                      u_charType(static_cast<UChar32>(c)) == U_CURRENCY_SYMBOL;
           });
}

/// "50,-" and "50.--" have no decimals, and no sign behind them.
bool isWithoutDecimals(Text const& end) {
    return end.size() >= 2 && (end[0] == U',' || end[0] == U'.') && isMinus(end[1]);
}

bool isNegative(Parts const& parts) {
    if (std::any_of(parts.front.begin(), parts.front.end(), isMinus))
        return true;
    if (parts.front.ends_with(U'(') && parts.end.find(U')') != Text::npos)
        return true;
    return !isWithoutDecimals(parts.end) && std::any_of(parts.end.begin(), parts.end.end(), isMinus);
}

struct Separators {
    char32_t decimal = 0;
    Text grouping;

    bool isGrouping(char32_t c) const { return grouping.find(plainSeparator(c)) != Text::npos; }
};

void appendDigit(std::string& text, char32_t c) { text += static_cast<char>('0' + digitOf(c)); }

/// Groups have three digits but for the first, or two as in "12,34,567"; a first group of 0 is none.
bool areGroups(std::vector<std::string> const& groups) {
    if (groups.size() == 1)
        return true;
    if (groups.front().empty() || groups.front().size() > 3 || groups.front() == "0" ||
        groups.back().size() != 3)
        return false;
    std::size_t const inner = groups.size() == 2 ? 3 : groups[1].size();
    return (inner == 2 || inner == 3) && std::all_of(groups.begin() + 1, groups.end() - 1,
                                                     [&](auto const& one) { return one.size() == inner; });
}

/// The whole part of a number without its separators; nothing when they stand at other places.
std::optional<std::string> wholePart(Text const& text, Separators const& separators) {
    std::vector<std::string> groups(1);
    for (char32_t const c : text) {
        if (isDigit(c))
            appendDigit(groups.back(), c);
        else if (separators.isGrouping(c))
            groups.emplace_back();
        else
            return std::nullopt;
    }
    if (!areGroups(groups))
        return std::nullopt;
    std::string whole;
    for (std::string const& group : groups)
        whole += group;
    return whole;
}

std::optional<std::string> plainForm(Text const& number, Separators const& separators) {
    std::size_t const point = std::min(number.find(separators.decimal), number.size());
    auto form = wholePart(number.substr(0, point), separators);
    if (!form || point == number.size())
        return form;
    *form += '.';
    for (char32_t const c : number.substr(point + 1)) {
        if (!isDigit(c))
            return std::nullopt;
        appendDigit(*form, c);
    }
    return form;
}

std::vector<Separators> separatorsOf(NumberRules const& rules) {
    if (rules.kind == NumberRules::Decimal::Auto)
        return {{U',', U".' "}, {U'.', U",' "}};
    Separators given{decoded(rules.decimal).front(), {}};
    for (std::string const& character : rules.grouping)
        given.grouping += plainSeparator(decoded(character).front());
    return {given};
}

std::string shown(json::Value const& value) {
    std::ostringstream text;
    text << value;
    return text.str();
}

/// What reading a number leaves over: blanks and commas are skipped, then it ends at what no number has.
std::string leftOver(std::string const& text, bool isInteger) {
    std::string rest = text;
    std::erase(rest, ' ');
    std::erase(rest, ',');
    std::size_t at = rest.find_first_not_of("+-");
    at = std::min(rest.find_first_not_of("0123456789", std::min(at, rest.size())), rest.size());
    if (!isInteger && at < rest.size() && rest[at] == '.')
        at = std::min(rest.find_first_not_of("0123456789", at + 1), rest.size());
    rest.erase(0, at);
    return rest.find_first_not_of(" \t\r\n\v\f") == rest.npos ? std::string() : rest;
}

/// Whether a comma may be a decimal one: fewer than three digits follow it, or it stands behind a point.
bool hasDecimalComma(std::string const& text) {
    constexpr std::size_t GROUP = 3;
    std::size_t const comma = text.rfind(',');
    if (comma == text.npos || comma + 1 == text.size())
        return false;
    std::size_t const end = std::min(text.find_first_not_of("0123456789", comma + 1), text.size());
    std::size_t const digits = end - comma - 1;
    return (digits > 0 && digits < GROUP) || text.find('.') < comma;
}

} // namespace

std::vector<std::string> numberForms(std::string const& text, NumberRules const& rules) {
    auto const parts = partsOf(decoded(text));
    std::vector<std::string> forms;
    if (!parts || !isBesideNumber(parts->front) || !isBesideNumber(parts->end))
        return forms;
    for (Separators const& separators : separatorsOf(rules)) {
        bool const beginsWithPoint = parts->front.ends_with(separators.decimal);
        auto form = plainForm((beginsWithPoint ? Text{U'0', separators.decimal} : Text()) + parts->number,
                              separators);
        if (!form)
            continue;
        std::string signedForm = (isNegative(*parts) ? "-" : "") + *form;
        if (std::find(forms.begin(), forms.end(), signedForm) == forms.end())
            forms.push_back(std::move(signedForm));
    }
    return forms;
}

std::string doubtAbout(std::string const& text, json::Value const& number) {
    std::string const asRead = "was read as " + shown(number);
    if (hasDecimalComma(text))
        return asRead + ", without its comma";
    std::string const rest = leftOver(text, number.isInt());
    return rest.empty() ? rest : asRead + ", without \"" + rest + "\" at its end";
}

} // namespace Reader
