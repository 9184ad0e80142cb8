#pragma once
// The pictures of a PDF of one page, as they are unpacked. Without anything that needs C++20, as qpdf's
// headers have it.

#include <string>
#include <string_view>
#include <vector>

namespace Reader {

/// SHA-256 of size, colour space, mask and points of each picture that a page written by PdfPageWriter uses,
/// in an order that depends on nothing but them. Of a page without words and pictures (`isBare`), of what is
/// drawn there. What cannot be unpacked, or would take more than 256 MiB, counts as it is packed; a PDF
/// that cannot be read, as it is.
std::vector<std::string> pictureDigests(std::string_view pdf, bool isBare);

} // namespace Reader
