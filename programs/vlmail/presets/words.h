#pragma once
// Lengths and numbers as advice says them.

#include "vlservice/cfg/geometry.h"

#include <string>

namespace VlMail {

std::string inQuotes(std::string const& text);

/// 1/100 mm as millimetres, with as many decimals as it has.
std::string inMillimetres(long long hundredths);

/// "left 2000, top 4500, right 11000, bottom 9000".
std::string inWords(Cfg::Rect const& rect);

} // namespace VlMail
