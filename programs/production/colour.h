#pragma once
// Whether what a page shows has colour.

#include "programs/reader/page_check.h"

namespace Production {

/// The resolution at which pages are drawn to be looked at.
constexpr double LOOKED_AT_DOTS_PER_INCH = 72;

/// More than a few points that are no shade of grey, within what pictures of grey paper have.
bool isColoured(Reader::Picture const& picture);

} // namespace Production
