#pragma once
// How wide a blank is in each font of a page, which PDFs seldom tell: learnt from the page's words.

#include "programs/reader/page.h"

#include <cstddef>
#include <limits>
#include <vector>

namespace Reader {

/// Lengths are in font sizes.
class BlankWidths {
public:
    /// Wider gaps between words say nothing about blanks.
    static constexpr double MAX_GAP = 1.0;

    explicit BlankWidths(Page const& page);

    /// A gap between two words of a line in that font.
    void addGap(std::size_t font, double gap) { samples_[font].gaps.push_back(gap); }
    double of(std::size_t font);

private:
    struct Sample {
        std::vector<double> gaps;
        std::size_t words = 0;
        // The average characters of words.
        double narrowest = std::numeric_limits<double>::infinity();
        double widest = 0;
    };

    static void addWord(Sample& sample, Word const& word);
    static double learnt(Sample& sample);

    Page const& page_;
    std::vector<Sample> samples_;
};

} // namespace Reader
