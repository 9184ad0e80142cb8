#pragma once
// What a postal address looks like as text, whatever the country.

#include <cstddef>
#include <string_view>

namespace Reader {

/// Longer lines are prose and never part of an address, in characters.
constexpr std::size_t MAX_ADDRESS_LINE = 45;

/// Whether a line of the text is too long for an address.
bool isProse(std::string_view text);

/// Whether the lines read as a name, a street or box with its number, and one line with a postcode at the end
/// or before the country. It is meant to be sure: tables and prose do not look like that, and some addresses
/// do not either.
bool looksLikePostalAddress(std::string_view text);

} // namespace Reader
