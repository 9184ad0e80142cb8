#include "programs/reader/month_names.h"

#include <unicode/dtfmtsym.h>
#include <unicode/uchar.h>
#include <unicode/uloc.h>
#include <unicode/unistr.h>

#include <algorithm>
#include <array>
#include <map>
#include <optional>

namespace Reader {
namespace {

constexpr int MONTHS = 12;
constexpr std::array<char const*, MONTHS> ENGLISH{"January",   "February", "March",    "April",
                                                  "May",       "June",     "July",     "August",
                                                  "September", "October",  "November", "December"};

/// Names in lower case, without a full stop, and the month that each means, from 0.
using Names = std::map<icu::UnicodeString, int>;

icu::UnicodeString plain(icu::UnicodeString name) {
    name.foldCase();
    if (name.endsWith(u'.'))
        name.truncate(name.length() - 1);
    return name;
}

Names namesIn(std::string const& language) {
    Names names;
    UErrorCode error = U_ZERO_ERROR;
    icu::DateFormatSymbols const symbols(icu::Locale(language.c_str()), error);
    if (U_FAILURE(error))
        return names;
    using Symbols = icu::DateFormatSymbols;
    for (auto const context : {Symbols::FORMAT, Symbols::STANDALONE}) {
        for (auto const width : {Symbols::WIDE, Symbols::ABBREVIATED}) {
            int count = 0;
            icu::UnicodeString const* const months = symbols.getMonths(count, context, width);
            for (int i = 0; i < std::min(count, MONTHS); ++i)
                names.emplace(plain(months[i]), i);
        }
    }
    return names;
}

/// Kept, since reading asks for one language again and again.
Names const& knownNamesIn(std::string const& language) {
    static thread_local std::map<std::string, Names> known;
    auto const found = known.find(language);
    return found != known.end() ? found->second : known.emplace(language, namesIn(language)).first->second;
}

/// A name of a month in a text, with the full stop behind it.
struct Found {
    int begin = 0;
    int end = 0;
    int month = 0;
};

bool isPartOfWord(UChar32 c) { return u_isalpha(c) || u_charType(c) == U_NON_SPACING_MARK; }

int endOfWord(icu::UnicodeString const& text, int at) {
    while (at < text.length() && isPartOfWord(text.char32At(at)))
        at = text.moveIndex32(at, 1);
    return at;
}

std::optional<Found> findMonth(icu::UnicodeString const& text, Names const& names) {
    for (int at = 0; at < text.length();) {
        int const end = endOfWord(text, at);
        auto const name = names.find(plain(text.tempSubStringBetween(at, end)));
        if (end > at && name != names.end())
            return Found{at, end < text.length() && text[end] == u'.' ? end + 1 : end, name->second};
        at = end > at ? end : text.moveIndex32(at, 1);
    }
    return std::nullopt;
}

/// The numbers of a text, in order.
std::vector<icu::UnicodeString> numbersIn(icu::UnicodeString const& text) {
    std::vector<icu::UnicodeString> numbers;
    bool wasDigit = false;
    for (int at = 0; at < text.length(); ++at) {
        bool const isDigit = text[at] >= u'0' && text[at] <= u'9';
        if (isDigit && !wasDigit)
            numbers.emplace_back();
        if (isDigit)
            numbers.back() += text[at];
        wasDigit = isDigit;
    }
    return numbers;
}

std::string utf8(icu::UnicodeString const& text) {
    std::string bytes;
    return text.toUTF8String(bytes);
}

/// "29/3/2014" for a text whose only numbers are a day and a year.
std::optional<std::string> inFigures(icu::UnicodeString const& text, Found const& month) {
    std::vector<icu::UnicodeString> numbers = numbersIn(text);
    if (numbers.size() != 2)
        return std::nullopt;
    bool const beginsWithYear = numbers[0].length() == 4;
    icu::UnicodeString const& day = numbers[beginsWithYear ? 1 : 0];
    icu::UnicodeString const& year = numbers[beginsWithYear ? 0 : 1];
    if (day.length() > 2 || (year.length() != 2 && year.length() != 4))
        return std::nullopt;
    return utf8(day) + '/' + std::to_string(month.month + 1) + '/' + utf8(year);
}

} // namespace

bool hasMonthNames(std::string const& language) {
    std::string const code = icu::Locale(language.c_str()).getName();
    int32_t const count = uloc_countAvailable();
    for (int32_t i = 0; i < count; ++i)
        if (code == uloc_getAvailable(i))
            return true;
    return false;
}

std::vector<std::string> datesInEnglish(std::string const& date, std::string const& language) {
    icu::UnicodeString const text = icu::UnicodeString::fromUTF8(date);
    auto const month = findMonth(text, knownNamesIn(language));
    if (!month)
        return {};
    icu::UnicodeString english = text;
    english.replaceBetween(month->begin, month->end,
                           icu::UnicodeString(ENGLISH[static_cast<std::size_t>(month->month)]));
    std::vector<std::string> dates{utf8(english)};
    if (auto const figures = inFigures(text, *month))
        dates.push_back(*figures);
    return dates;
}

} // namespace Reader
