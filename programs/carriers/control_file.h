#pragma once
// What a print shop gets of letters: a file with their pages, and what it is told of that file.

#include "programs/carriers/carrier.h"

#include <functional>
#include <string>
#include <string_view>

namespace Carriers {

/// Calls `write` for KEY.pdf, KEY.csv and last KEY.json: whoever finds the last one is to find the others.
void forEachFile(
    Parcel const& parcel,
    std::function<void(std::string const& name, std::string_view bytes, bool isLast)> const& write);

/// One object; docs/carriers.md has its keys. `file` is the name of the PDF.
std::string controlJson(Parcel const& parcel, std::string const& file);
/// A line of names and a line for each letter, with semicolons between; UTF-8.
std::string controlCsv(Parcel const& parcel, std::string const& file);

/// As a value of such a line: on one line, without what a spreadsheet would take for a formula.
std::string csvField(std::string const& text);

} // namespace Carriers
