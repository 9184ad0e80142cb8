#pragma once
// A page's lines as texts.

#include "programs/reader/layout.h"

#include <string>
#include <vector>

namespace Reader {

inline std::vector<std::string> linesOf(Page const& page, LayoutRules const& rules = {}) {
    Layout const layout = layOut(page, rules);
    std::vector<std::string> texts;
    for (Line const& line : layout.lines)
        texts.push_back(textOf(page, line));
    return texts;
}

} // namespace Reader
