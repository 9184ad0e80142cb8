#include "programs/reader/page_check.h"

#include "programs/reader/clean_text.h"
#include "programs/reader/writing_direction.h"

#include <algorithm>
#include <cstdlib>
#include <string>
#include <tuple>
#include <vector>

namespace Reader {
namespace {

/// In 1/100 mm: places are rounded.
constexpr int SAME_PLACE = 5;
/// Of the size of a font: how far above their line words begin is told in more than one way.
constexpr int SAME_HEIGHT = 2;
/// Of 255: by how much a point may be lighter or darker.
constexpr int SAME_SHADE = 40;
/// So many points of a picture may differ by more.
constexpr std::size_t STRAY_POINTS = 8;

/// A word, and how it is read off a sheet.
struct Shown {
    std::string text;
    Word const* word;
};

/// What is typed in a script from right to left is drawn from left to right as it was typed.
std::string textOf(Page const& page, Word const& word) {
    return page.isTyped && isFromRightToLeft(word.text) ? cleanText(inReadingOrder(*utf16Of(word.text)))
                                                        : word.text;
}

std::vector<Shown> sorted(Page const& page) {
    std::vector<Shown> words;
    for (Word const& word : page.words)
        words.push_back({textOf(page, word), &word});
    std::sort(words.begin(), words.end(), [](Shown const& a, Shown const& b) {
        return std::tie(a.text, a.word->box.top, a.word->box.left) <
               std::tie(b.text, b.word->box.top, b.word->box.left);
    });
    return words;
}

bool isSame(Shown const& one, Shown const& other) {
    Box const& box = one.word->box;
    Box const& otherBox = other.word->box;
    return one.text == other.text && std::abs(box.left - otherBox.left) <= SAME_PLACE &&
           std::abs(box.top - otherBox.top) <= one.word->size / SAME_HEIGHT;
}

bool isSameShade(char one, char other) {
    return std::abs(static_cast<unsigned char>(one) - static_cast<unsigned char>(other)) <= SAME_SHADE;
}

} // namespace

bool haveSameWords(Page const& one, Page const& other) {
    std::vector<Shown> const words = sorted(one);
    std::vector<Shown> const others = sorted(other);
    return std::equal(words.begin(), words.end(), others.begin(), others.end(), isSame);
}

bool lookTheSame(Picture const& one, Picture const& other) {
    if (one.width != other.width || one.height != other.height)
        return false;
    std::size_t strays = 0;
    for (std::size_t i = 0; i + 2 < one.points.size(); i += 3)
        strays += !isSameShade(one.points[i], other.points[i]) ||
                  !isSameShade(one.points[i + 1], other.points[i + 1]) ||
                  !isSameShade(one.points[i + 2], other.points[i + 2]);
    return strays <= STRAY_POINTS;
}

} // namespace Reader
