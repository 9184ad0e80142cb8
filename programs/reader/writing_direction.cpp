#include "programs/reader/writing_direction.h"

#include "programs/base/utf8.h"

#include <algorithm>
#include <cstdint>
#include <limits>
#include <memory>
#include <numeric>
#include <unicode/ubidi.h>
#include <unicode/uchar.h>

namespace Reader {
namespace {

enum class Strength { None, LeftToRight, RightToLeft };

Strength strengthOf(UChar32 c) {
    switch (u_charDirection(c)) {
    case U_LEFT_TO_RIGHT:
        return Strength::LeftToRight;
    case U_RIGHT_TO_LEFT:
    case U_RIGHT_TO_LEFT_ARABIC:
        return Strength::RightToLeft;
    default:
        return Strength::None;
    }
}

/// Of the first letter that has one.
Strength strengthOf(std::string_view text) {
    for (std::size_t at = 0; at < text.size();)
        if (Strength const strength = strengthOf(static_cast<UChar32>(Base::nextCharacter(text, at)));
            strength != Strength::None)
            return strength;
    return Strength::None;
}

/// No character of a script from right to left has a smaller first byte.
bool mayBeFromRightToLeft(std::string_view text) {
    return std::any_of(text.begin(), text.end(),
                       [](char c) { return static_cast<unsigned char>(c) >= 0xD6; });
}

/// What has no direction of its own, a number say, goes with the words from left to right beside it.
std::vector<UBiDiLevel> levelsOf(std::vector<Strength> const& words) {
    auto const count = [&](Strength strength) { return std::count(words.begin(), words.end(), strength); };
    UBiDiLevel const base = count(Strength::RightToLeft) >= count(Strength::LeftToRight) ? 1 : 0;
    std::vector<UBiDiLevel> levels(words.size(), 1);
    for (std::size_t i = 0; i < words.size(); ++i) {
        bool const isBeside = (i > 0 && words[i - 1] == Strength::LeftToRight) ||
                              (i + 1 < words.size() && words[i + 1] == Strength::LeftToRight);
        if (words[i] == Strength::LeftToRight || (words[i] == Strength::None && isBeside))
            levels[i] = static_cast<UBiDiLevel>(2 * base);
    }
    return levels;
}

} // namespace

bool isFromRightToLeft(std::string_view text) {
    return mayBeFromRightToLeft(text) && strengthOf(text) == Strength::RightToLeft;
}

std::u16string inReadingOrder(std::u16string_view seen) {
    bool const isPlain = std::all_of(seen.begin(), seen.end(), [](char16_t c) { return c < 0x0590; });
    if (isPlain || seen.size() > static_cast<std::size_t>(std::numeric_limits<std::int16_t>::max()))
        return std::u16string(seen);
    UErrorCode status = U_ZERO_ERROR;
    std::unique_ptr<UBiDi, decltype(&ubidi_close)> const bidi(ubidi_open(), &ubidi_close);
    ubidi_setInverse(bidi.get(), true);
    ubidi_setPara(bidi.get(), seen.data(), static_cast<std::int32_t>(seen.size()), 0, nullptr, &status);
    std::u16string read(2 * seen.size() + 1, u'\0');
    std::int32_t const length =
        ubidi_writeReordered(bidi.get(), read.data(), static_cast<std::int32_t>(read.size()),
                             UBIDI_DO_MIRRORING | UBIDI_KEEP_BASE_COMBINING, &status);
    if (U_FAILURE(status))
        return std::u16string(seen);
    read.resize(static_cast<std::size_t>(length));
    return read;
}

std::vector<std::size_t> readingOrderOf(std::vector<std::string_view> const& seen) {
    std::vector<std::size_t> order(seen.size());
    std::iota(order.begin(), order.end(), std::size_t{0});
    if (std::none_of(seen.begin(), seen.end(), isFromRightToLeft))
        return order;
    std::vector<Strength> words;
    for (std::string_view const word : seen)
        words.push_back(strengthOf(word));
    std::vector<UBiDiLevel> const levels = levelsOf(words);
    std::vector<std::int32_t> map(seen.size());
    // Turning stretches round is its own inverse: what makes an order to be seen makes one to be read.
    ubidi_reorderVisual(levels.data(), static_cast<std::int32_t>(levels.size()), map.data());
    std::copy(map.begin(), map.end(), order.begin());
    return order;
}

} // namespace Reader
