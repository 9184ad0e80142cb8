#pragma once
// What pages say of their place in a letter: "Page 2 of 3".

#include "programs/reader/layout.h"

#include <string>
#include <vector>

namespace Reader {

struct PageNumbering {
    int number = 0;
    /// The whole line, and where it stands.
    std::string line;
    Box box;
};

/// Those that the page has, in six languages. A number alone is none, and neither is one of many pages in a
/// sentence.
std::vector<PageNumbering> pageNumberingsOn(Page const& page, Layout const& layout);

} // namespace Reader
