#pragma once
// The pages of docs/ as they are carried in the programs.

#include <span>
#include <string_view>

namespace Manual {

struct Page {
    /// "service.md".
    std::string_view name;
    std::string_view text;
};

std::span<Page const> pages();

} // namespace Manual
