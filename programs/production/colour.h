#pragma once
// Whether what a page shows has colour.

#include "programs/reader/document.h"

#include <string>

namespace Production {

/// The resolution at which pages are drawn to be looked at.
constexpr double LOOKED_AT_DOTS_PER_INCH = 72;

/// More than a few points that are no shade of grey, within what pictures of grey paper have.
bool isColoured(Reader::Picture const& picture);

/// Whether page `number` of a document has colour; `pdf` is the page by itself. Draws it only where its
/// contents do not tell. Throws Error when it cannot be drawn.
bool hasColour(Reader::Document& document, int number, std::string const& pdf);

} // namespace Production
