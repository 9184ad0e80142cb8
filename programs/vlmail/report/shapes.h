#pragma once
// What is drawn over the picture of a page: zones, matches and what is wrong, each with its look and its
// name. Reports write these as HTML, the workbench sends them to its page, and both look by drawing.css.

#include "programs/vlmail/report/report.h"

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

namespace VlMail::Report {

struct StateLook {
    char const* words;
    /// Of the style sheet.
    char const* look;
};

StateLook lookOf(Field const& field);
bool isTrouble(Field const& field);
/// "zone" or "address window".
std::string kindOf(Zone const& zone);

struct Shape {
    /// Classes of the style sheet.
    std::string look;
    /// On the sheet, where it ends at the edge.
    Reader::Box box;
    /// What stands at it; nothing at a line that was joined with another.
    std::optional<std::string> tag = {};
    /// In words, for those who do not see it.
    std::string label = {};
    /// Whose it is: a zone of the letter, a field of that zone, or a fault.
    std::optional<std::size_t> zone = {};
    std::optional<std::size_t> field = {};
    std::optional<std::size_t> fault = {};
};

/// Those on a sheet of the letter in the order in which they are drawn: zones, the largest first, so that
/// none hides another from the pointer, then matches, then faults.
std::vector<Shape> shapesOn(Letter const& letter, std::size_t sheet);

/// The style sheet of drawings. Colours of the page around them are its own.
extern char const* const DRAWING_STYLE;

} // namespace VlMail::Report
