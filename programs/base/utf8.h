#pragma once
// UTF-8 by its characters. Bytes that are no UTF-8 count as one character each stretch, as ICU takes them.

#include <cstddef>
#include <string>
#include <string_view>

namespace Base {

/// What nextCharacter() gives for bytes that are no UTF-8.
constexpr char32_t NO_CHARACTER = 0xFFFF'FFFF;

/// The character at `at`, which must lie before the end; `at` moves behind it.
char32_t nextCharacter(std::string_view text, std::size_t& at);

bool isUtf8(std::string_view text);

/// The text with U+FFFD for each stretch that is not UTF-8: JSON and terminals take nothing else.
std::string validUtf8(std::string_view text);

std::size_t characterCount(std::string_view text);

/// So many characters from the front, or all.
std::string_view firstCharacters(std::string_view text, std::size_t count);

/// At most so many bytes from the front, cut between characters.
std::string_view firstBytes(std::string_view text, std::size_t maxBytes);

/// Whether a character begins at `at`, or the text ends there.
bool isBetweenCharacters(std::string_view text, std::size_t at);

void appendCharacter(std::string& text, char32_t character);

} // namespace Base
