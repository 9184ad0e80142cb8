#pragma once
// What the bytes of a file seem to be.

#include <string_view>

namespace Reader {

bool isPdf(std::string_view bytes);

/// In words, for a file that is no PDF and was taken for one: "a web page".
std::string_view kindInWords(std::string_view bytes);

} // namespace Reader
