#pragma once
// Lengths and numbers as advice says them.

#include "programs/base/millimetres.h"
#include "programs/base/quoting.h"
#include "vlservice/cfg/geometry.h"

#include <string>

namespace VlMail {

using Base::inMillimetres;
using Base::inQuotes;

/// "left 2000, top 4500, right 11000, bottom 9000".
std::string inWords(Cfg::Rect const& rect);

} // namespace VlMail
