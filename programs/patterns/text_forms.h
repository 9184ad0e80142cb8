#pragma once
// Other forms of a text that mean the same to people: composed and decomposed letters, letters that look
// alike, and either case.

#include <optional>
#include <string>
#include <string_view>

namespace Patterns {

// Texts are UTF-8; stretches that are not become U+FFFD.

/// With composed letters, as documents are read (NFC).
std::string composed(std::string_view text);

/// Hyphens, dashes, quotation marks, dots and blanks of typography as the plain ones of a keyboard.
std::string withPlainMarks(std::string_view text);

/// The first character that withPlainMarks() changes.
std::optional<std::string> firstUnplainMark(std::string_view text);

/// As "U+2011".
std::string codePointOf(std::string_view character);

/// A piece of a text that is like another text.
struct Likeness {
    std::string piece;
    /// Characters to add, drop or change, without regard to case.
    std::size_t distance = 0;
};

/// The piece of `line` that is nearest to `wanted`, the first of equals. Costs the product of their lengths.
Likeness likestPiece(std::string_view line, std::string_view wanted);

/// Without regard to case.
std::string foldedCase(std::string_view text);

} // namespace Patterns
