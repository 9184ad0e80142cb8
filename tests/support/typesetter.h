#pragma once
// Sets words on a page by hand, for tests of what is found on it.

#include "programs/reader/page.h"

#include <sstream>
#include <string>

namespace Reader {

/// Every letter is half a font size wide; the box reaches a fifth of it below the line on which letters
/// stand.
class Typesetter {
public:
    static constexpr int SIZE = 400;
    static constexpr int LETTER = SIZE / 2;

    Typesetter() { page.fonts = {{"Serif"}}; }

    /// The words of `text` from there on, `gap` apart; gives the right edge.
    int line(int left, int base, std::string const& text, int size = SIZE, int gap = 100) {
        std::istringstream words(text);
        for (std::string one; words >> one;)
            left = word(left, base, one, size) + gap;
        return left - gap;
    }

    int word(int left, int base, std::string const& text, int size = SIZE) {
        int const right = left + static_cast<int>(text.size()) * size / 2;
        page.words.push_back(
            {text, {left, base - size, right, base + size / 5}, size, 0, Turn::Upright, true});
        return right;
    }

    Page page{1, 21000, 29700, {}, {}};
};

} // namespace Reader
