#include "programs/base/plain_text.h"

#include "programs/base/hex.h"
#include "programs/base/utf8.h"

#include <algorithm>

namespace Base {
namespace {

constexpr std::size_t MAX_LINE_BYTES = 500;
constexpr char32_t REPLACEMENT = 0xFFFD;

struct Range {
    char32_t first;
    char32_t last;
};

/// Marks, embeddings, overrides and isolates of direction, and separators that break a line.
constexpr Range HIDDEN_CONTROLS[]{
    {0x061C, 0x061C}, {0x200E, 0x200F}, {0x2028, 0x202E}, {0x2066, 0x2069}, {0xFFF9, 0xFFFB}};

bool isHiddenControl(char32_t character) {
    return std::any_of(std::begin(HIDDEN_CONTROLS), std::end(HIDDEN_CONTROLS), [=](Range const& range) {
        return range.first <= character && character <= range.last;
    });
}

bool isBlank(char32_t character) { return character >= U'\t' && character <= U'\r'; }

void appendPlain(std::string& plain, char32_t character) {
    if (character == NO_CHARACTER)
        appendCharacter(plain, REPLACEMENT);
    else if (isBlank(character))
        plain += ' ';
    else if (isControl(character) || isHiddenControl(character))
        plain += "\\u" + hexNumber(character, 4);
    else
        appendCharacter(plain, character);
}

std::string withoutControls(std::string_view text, bool keepsLines) {
    std::string plain;
    plain.reserve(text.size());
    for (std::size_t at = 0; at < text.size();) {
        char32_t const character = nextCharacter(text, at);
        if (keepsLines && character == U'\n')
            plain += '\n';
        else
            appendPlain(plain, character);
    }
    return plain;
}

} // namespace

bool isControl(char32_t character) { return character < 0x20 || (character >= 0x7F && character < 0xA0); }

std::string plainText(std::string_view text) { return withoutControls(text, true); }

std::string plainLine(std::string_view text) { return withoutControls(text, false); }

std::string oneLine(std::string_view text) {
    // What comes behind cannot be in the result, however long the text.
    std::string const line = plainLine(text.substr(0, 2 * MAX_LINE_BYTES));
    return std::string(firstBytes(line, MAX_LINE_BYTES));
}

bool isPlainText(std::string_view text, std::size_t maxBytes) {
    return text.size() <= maxBytes && isUtf8(text) &&
           std::none_of(text.begin(), text.end(), [](unsigned char c) { return c < 0x80 && isControl(c); });
}

} // namespace Base
