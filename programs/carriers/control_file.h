#pragma once
// What a print shop is told of a file with letters.

#include "programs/carriers/carrier.h"

#include <string>

namespace Carriers {

/// One object; docs/carriers.md has its keys. `file` is the name of the PDF.
std::string controlJson(Parcel const& parcel, std::string const& file);
/// A line of names and a line for each letter, with semicolons between; UTF-8.
std::string controlCsv(Parcel const& parcel, std::string const& file);

/// As a value of such a line: on one line, without what a spreadsheet would take for a formula.
std::string csvField(std::string const& text);

} // namespace Carriers
