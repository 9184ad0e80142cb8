#pragma once
// Texts from anywhere as people may read them: on a terminal, in a log, in a report. Documents, mailings,
// settings and unproven services can hold bytes that steer a terminal or turn a line round.

#include <cstddef>
#include <string>
#include <string_view>

namespace Base {

/// Whether it is a control character of ASCII or beyond it (U+0000 to U+001F, U+007F to U+009F).
bool isControl(char32_t character);

/// The text as valid UTF-8 in which nothing acts: line feeds stay, other white space that is a control
/// character is a blank, and other controls, of terminals, of the direction of writing and of lines, are
/// shown as "\u009b". In JSON text that is the same value.
std::string plainText(std::string_view text);

/// The same on one line: a line feed is a blank too.
std::string plainLine(std::string_view text);

/// The same of at most 500 bytes, cut between characters, for texts that are stored and sent.
std::string oneLine(std::string_view text);

/// Whether the text is valid UTF-8 without control characters of ASCII, and no longer than that many bytes.
bool isPlainText(std::string_view text, std::size_t maxBytes);

} // namespace Base
