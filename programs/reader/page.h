#pragma once
// What is on a page: its size and its words. Lines and blocks are made of them in layout.h.

#include "programs/reader/geometry.h"

#include <cstdint>
#include <string>
#include <vector>

namespace Reader {

struct Word {
    /// UTF-8 in NFC, without blanks and control characters, not empty.
    std::string text;
    Box box;
    /// Size of the font in 1/100 mm, above 0.
    int size = 0;
    /// Position in Page::fonts.
    std::uint16_t font = 0;
    Turn turn = Turn::Upright;
    /// The document has a blank behind this word; without one, words that touch are one word in two fonts.
    bool blankBehind = true;
};

struct Font {
    std::string name;
    /// Width of a blank in font sizes; 0 where it is not known.
    double blank = 0;
};

/// In 1/100 mm, as shown.
struct PageSize {
    int width = 0;
    int height = 0;

    PageSize turned() const { return {height, width}; }

    friend bool operator==(PageSize const&, PageSize const&) = default;
};

struct Page {
    /// From 1.
    int number = 0;
    /// In 1/100 mm, as shown.
    int width = 0;
    int height = 0;
    /// In no order that anything may depend on.
    std::vector<Word> words;
    std::vector<Font> fonts;
    /// Words stand from left to right in the order in which they are read, whatever their script.
    bool isTyped = false;

    PageSize size() const { return {width, height}; }
};

} // namespace Reader
