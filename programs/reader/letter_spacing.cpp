#include "programs/reader/letter_spacing.h"

#include "programs/base/utf8.h"

#include <algorithm>
#include <limits>
#include <unicode/uchar.h>

namespace Reader {
namespace {

constexpr std::size_t MIN_LETTERS = 4;
/// Gaps inside words are alike, but for what is rounded; a blank makes at least half as much more.
constexpr int ROUNDING = 2;

bool isOneCharacter(SetWord const& word) { return Base::characterCount(word.text) == 1; }

bool isLetter(SetWord const& word) {
    std::size_t at = 0;
    return u_isalpha(static_cast<UChar32>(Base::nextCharacter(word.text, at)));
}

bool isOfOneRow(SetWord const& a, SetWord const& b) {
    return isOneCharacter(b) && a.font == b.font && a.size == b.size;
}

/// The words from `begin` to `end` are single characters of one font and size.
void joinRow(std::vector<SetWord> const& words, std::size_t begin, std::size_t end,
             std::vector<bool>& joined) {
    int narrowest = std::numeric_limits<int>::max();
    for (std::size_t i = begin + 1; i < end; ++i)
        narrowest = std::min(narrowest, std::max(words[i].gapBefore, 0));
    auto const isInside = [&](std::size_t i) {
        return i > begin && words[i].gapBefore * 2LL <= narrowest * 3LL + ROUNDING;
    };
    std::size_t letters = 0;
    std::size_t most = 0;
    for (std::size_t i = begin; i < end; ++i) {
        letters = (isInside(i) ? letters : 0) + isLetter(words[i]);
        most = std::max(most, letters);
    }
    if (most >= MIN_LETTERS)
        for (std::size_t i = begin + 1; i < end; ++i)
            joined[i] = isInside(i);
}

} // namespace

std::vector<bool> belongsToWordBefore(std::vector<SetWord> const& words) {
    std::vector<bool> joined(words.size(), false);
    for (std::size_t begin = 0; begin < words.size();) {
        std::size_t end = begin + 1;
        while (end < words.size() && isOneCharacter(words[begin]) && isOfOneRow(words[begin], words[end]))
            ++end;
        joinRow(words, begin, end, joined);
        begin = end;
    }
    return joined;
}

} // namespace Reader
