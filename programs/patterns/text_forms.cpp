#include "programs/patterns/text_forms.h"

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <stdexcept>
#include <unicode/normalizer2.h>
#include <unicode/uchar.h>
#include <unicode/unistr.h>
#include <vector>

namespace Patterns {
namespace {

icu::UnicodeString unicode(std::string_view text) {
    return icu::UnicodeString::fromUTF8(
        icu::StringPiece(text.data(), static_cast<std::int32_t>(text.size())));
}

std::string utf8(icu::UnicodeString const& text) {
    std::string result;
    text.toUTF8String(result);
    return result;
}

/// The plain form of a mark; 0 for a character that is none.
char plainMark(UChar32 c) {
    switch (c) {
    case 0x2018: // single quotation marks
    case 0x2019:
    case 0x201A:
    case 0x201B:
    case 0x2032: // prime
    case 0x02BC: // apostrophe that is a letter
    case 0x00B4: // acute accent
        return '\'';
    case 0x201C: // double quotation marks
    case 0x201D:
    case 0x201E:
    case 0x201F:
    case 0x2033: // double prime
    case 0x00AB: // angle quotation marks
    case 0x00BB:
        return '"';
    case 0x2212: // minus
    case 0x2043: // bullet
        return '-';
    case 0x00B7: // middle dot
    case 0x2024: // one dot leader
        return '.';
    case 0xFF1A: // wide colon
    case 0x2236: // ratio
        return ':';
    case 0x2044: // fraction slash
    case 0x2215: // division slash
        return '/';
    default:
        break;
    }
    if (c != '-' && u_charType(c) == U_DASH_PUNCTUATION)
        return '-';
    return c != ' ' && u_charType(c) == U_SPACE_SEPARATOR ? ' ' : '\0';
}

std::vector<UChar32> codePoints(icu::UnicodeString const& text) {
    std::vector<UChar32> points;
    for (std::int32_t i = 0; i < text.length(); i = text.moveIndex32(i, 1))
        points.push_back(text.char32At(i));
    return points;
}

UChar32 folded(UChar32 c) { return u_foldCase(c, U_FOLD_CASE_DEFAULT); }

/// The cheapest way to make a piece of the line that ends here into the beginning of what is wanted.
struct Way {
    std::size_t distance = 0;
    std::size_t begin = 0;
};

Way cheaper(Way const& a, Way const& b) { return b.distance < a.distance ? b : a; }

} // namespace

std::string composed(std::string_view text) {
    UErrorCode status = U_ZERO_ERROR;
    icu::Normalizer2 const* const nfc = icu::Normalizer2::getNFCInstance(status);
    if (U_FAILURE(status))
        throw std::runtime_error(u_errorName(status));
    icu::UnicodeString const result = nfc->normalize(unicode(text), status);
    return U_FAILURE(status) ? std::string(text) : utf8(result);
}

std::string withPlainMarks(std::string_view text) {
    icu::UnicodeString result;
    for (UChar32 const c : codePoints(unicode(text))) {
        char const plain = plainMark(c);
        result.append(plain != '\0' ? static_cast<UChar32>(plain) : c);
    }
    return utf8(result);
}

std::optional<std::string> firstUnplainMark(std::string_view text) {
    for (UChar32 const c : codePoints(unicode(text)))
        if (plainMark(c) != '\0')
            return utf8(icu::UnicodeString(c));
    return std::nullopt;
}

std::string codePointOf(std::string_view character) {
    char buffer[16];
    std::snprintf(buffer, sizeof buffer, "U+%04X", static_cast<unsigned>(unicode(character).char32At(0)));
    return buffer;
}

Likeness likestPiece(std::string_view line, std::string_view wanted) {
    std::vector<UChar32> const in = codePoints(unicode(line));
    std::vector<UChar32> const want = codePoints(unicode(wanted));
    // row[j]: the first j wanted characters against pieces that end at the line's character i.
    std::vector<Way> row(want.size() + 1);
    for (std::size_t j = 0; j <= want.size(); ++j)
        row[j] = {j, 0};
    Way best = row.back();
    std::size_t bestEnd = 0;
    for (std::size_t i = 1; i <= in.size(); ++i) {
        Way diagonal = row[0];
        row[0] = {0, i};
        for (std::size_t j = 1; j <= want.size(); ++j) {
            Way const above = row[j];
            std::size_t const change = folded(in[i - 1]) == folded(want[j - 1]) ? 0 : 1;
            Way way{diagonal.distance + change, diagonal.begin};
            way = cheaper(way, {above.distance + 1, above.begin});
            row[j] = cheaper(way, {row[j - 1].distance + 1, row[j - 1].begin});
            diagonal = above;
        }
        if (row.back().distance < best.distance) {
            best = row.back();
            bestEnd = i;
        }
    }
    icu::UnicodeString piece;
    for (std::size_t i = best.begin; i < bestEnd; ++i)
        piece.append(in[i]);
    return {utf8(piece), best.distance};
}

std::string foldedCase(std::string_view text) { return utf8(unicode(text).foldCase()); }

} // namespace Patterns
