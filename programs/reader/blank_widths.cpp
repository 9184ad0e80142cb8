#include "programs/reader/blank_widths.h"

#include "programs/base/utf8.h"

#include <algorithm>

namespace Reader {
namespace {

/// The width of a blank is the median of the gaps up to MAX_GAP, within these limits: justified text
/// stretches it.
constexpr double MIN_BLANK = 1.0 / 3.0;
constexpr double MAX_BLANK = 0.6;
/// In typed text a blank is as wide as a character. All characters of a font are equally wide when the
/// average ones of so many words differ by no more than this share.
constexpr std::size_t MIN_TYPED_WORDS = 3;
constexpr std::size_t MIN_TYPED_CHARACTERS = 3;
constexpr double MAX_TYPED_SPREAD = 0.01;

} // namespace

BlankWidths::BlankWidths(Page const& page) : page_(page), samples_(page.fonts.size()) {
    for (Word const& word : page.words)
        addWord(samples_[word.font], word);
}

void BlankWidths::addWord(Sample& sample, Word const& word) {
    std::size_t const characters = Base::characterCount(word.text);
    if (characters < MIN_TYPED_CHARACTERS)
        return;
    double const width = lengthAlong(word.box, word.turn) / (static_cast<double>(characters) * word.size);
    ++sample.words;
    sample.narrowest = std::min(sample.narrowest, width);
    sample.widest = std::max(sample.widest, width);
}

double BlankWidths::of(std::size_t font) {
    double const known = page_.fonts[font].blank;
    return known > 0 ? known : learnt(samples_[font]);
}

double BlankWidths::learnt(Sample& sample) {
    if (sample.words >= MIN_TYPED_WORDS &&
        sample.widest - sample.narrowest <= MAX_TYPED_SPREAD * sample.widest)
        return std::clamp(sample.widest, MIN_BLANK, MAX_BLANK);
    if (sample.gaps.empty())
        return MIN_BLANK;
    auto const middle = sample.gaps.begin() + static_cast<std::ptrdiff_t>(sample.gaps.size() / 2);
    std::nth_element(sample.gaps.begin(), middle, sample.gaps.end());
    return std::clamp(*middle, MIN_BLANK, MAX_BLANK);
}

} // namespace Reader
