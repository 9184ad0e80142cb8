#include "programs/reader/page_check.h"

#include <algorithm>
#include <cstdlib>
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

std::vector<Word const*> sorted(Page const& page) {
    std::vector<Word const*> words;
    for (Word const& word : page.words)
        words.push_back(&word);
    std::sort(words.begin(), words.end(), [](Word const* a, Word const* b) {
        return std::tie(a->text, a->box.top, a->box.left) < std::tie(b->text, b->box.top, b->box.left);
    });
    return words;
}

bool isSame(Word const* one, Word const* other) {
    return one->text == other->text && std::abs(one->box.left - other->box.left) <= SAME_PLACE &&
           std::abs(one->box.top - other->box.top) <= one->size / SAME_HEIGHT;
}

bool isSameShade(char one, char other) {
    return std::abs(static_cast<unsigned char>(one) - static_cast<unsigned char>(other)) <= SAME_SHADE;
}

} // namespace

bool haveSameWords(Page const& one, Page const& other) {
    std::vector<Word const*> const words = sorted(one);
    std::vector<Word const*> const others = sorted(other);
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
