#pragma once
// Text as documents hold it, made into text that patterns can be written for.

#include <optional>
#include <string>
#include <string_view>

namespace Reader {

/// UTF-8 in NFC. Ligatures and other presentation forms become their letters, and the hyphens U+2010 and
/// U+2011 the plain one; white space becomes one blank and disappears at the ends, as do control characters,
/// soft hyphens and characters without width everywhere. What is no UTF-16 becomes U+FFFD.
std::string cleanText(std::u16string_view text);

/// Nothing when the text is no valid UTF-8.
std::optional<std::u16string> utf16Of(std::string_view utf8);

/// Reads each byte as a character of Windows-1252, of which ISO 8859-1 is a part.
std::u16string utf16OfWindows1252(std::string_view text);

/// Nothing when a character of the text, which is UTF-8, has no place in it.
std::optional<std::string> windows1252Of(std::string_view utf8);

} // namespace Reader
