#pragma once
// How findings say places and ways on a page.

#include "programs/reader/geometry.h"
#include "programs/reader/page.h"

#include <string>
#include <vector>

namespace Production {

using Reader::Box;

/// How far something has to go, in 1/100 mm; right and down are positive.
struct Way {
    int right = 0;
    int down = 0;
};

bool isInside(Box const& box, Box const& room);

/// The shortest way of `box` into `room`; 0 where it lies there, or is too large to.
Way wayInto(Box const& box, Box const& room);
/// The shortest way of `box` out of `zone` on which it stays in `room`, or else the shortest.
Way wayOutOf(Box const& box, Box const& zone, Box const& room);

/// "12 mm right", "12 mm right and 3.5 mm up".
std::string inWords(Way const& way);
/// "move it 12 mm right", and where it is too large "make it 3 mm narrower".
std::string fixFor(Box const& box, Box const& room);

/// "20 to 105 mm across and 45 to 90 mm down".
std::string placeInWords(Box const& box);

/// The page with only those of its words that have a part in the box.
Reader::Page wordsOf(Reader::Page const& page, Box const& box);

/// Text that stands together, in quotes and cut when it is long.
struct TextBlock {
    Box box;
    /// Of its largest print.
    int size = 0;
    std::string text;
};
std::vector<TextBlock> blocksIn(Reader::Page const& page);

/// The words with a part in the box, in quotes and cut when they are many; "something" where there are none.
std::string textInWords(Reader::Page const& page, Box const& box);

} // namespace Production
