#pragma once
// The one place where patterns are compiled, guarded against those that the engine's parser does not survive.
// Internal, and for sources that run the engine: its headers come along.

#include <boost/regex/icu.hpp>

#include <string_view>
#include <vector>

namespace Cfg {

using CodePoints = std::vector<UChar32>;
using Decoder = boost::u8_to_u32_iterator<char const*, UChar32>;

/// Throws std::out_of_range for a text that is not UTF-8.
CodePoints decode(std::string_view utf8);

/// Throws boost::regex_error for a bad pattern, also for one that the parser would never finish, and
/// std::out_of_range for one that is not UTF-8.
boost::u32regex compilePattern(std::string_view pattern, boost::regex_constants::syntax_option_type options);

} // namespace Cfg
