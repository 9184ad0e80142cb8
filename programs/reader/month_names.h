#pragma once
// Names of months in the languages that ICU knows.

#include <string>
#include <vector>

namespace Reader {

/// Whether it is the code of a language, such as "de" or "pt_BR", that has names of months of its own.
bool hasMonthNames(std::string const& language);

/// What a date with a name of a month in that language may be read as: with the English name in its place,
/// then as day/month/year where it has nothing else. None for a date without such a name.
std::vector<std::string> datesInEnglish(std::string const& date, std::string const& language);

} // namespace Reader
