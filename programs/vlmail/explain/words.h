#pragma once
// Texts, lengths and numbers as people read them in a sentence.

#include <cstddef>
#include <string>
#include <string_view>

namespace VlMail::Words {

/// On one line, its line breaks as " / ", and no longer than so many characters.
std::string shortened(std::string_view text, std::size_t letters = 60);

/// The same in double quotes.
std::string excerpt(std::string_view text, std::size_t letters = 60);

/// 1/100 mm as "95 mm" or "95.5 mm".
std::string millimetres(long long hundredths);

/// The shortest text that reads as that number, in any locale.
std::string number(double value);

} // namespace VlMail::Words
