#pragma once
// A page of a text file as a PDF.

#include "programs/reader/page.h"

#include <string>

namespace Reader {

/// Draws the words of a page at their places: in Courier, which every reader of PDFs has, and words with
/// characters that its encoding lacks in a font that is embedded. The same page gives the same bytes.
/// Throws Error, with `where` in front, for a character that the embedded font lacks too.
std::string pdfOfTypedPage(Page const& page, std::string const& where);

} // namespace Reader
