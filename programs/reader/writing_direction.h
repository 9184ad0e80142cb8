#pragma once
// Text from right to left: pages show it in another order than it is read in.

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace Reader {

/// Whether a letter of the text, which is UTF-8, belongs to a script from right to left.
bool isFromRightToLeft(std::string_view text);

/// The characters of a word from left to right as they are seen, in the order in which they are read.
std::u16string inReadingOrder(std::u16string_view seen);

/// The positions of a line's words, which stand from left to right, in the order in which they are read.
std::vector<std::size_t> readingOrderOf(std::vector<std::string_view> const& seen);

} // namespace Reader
