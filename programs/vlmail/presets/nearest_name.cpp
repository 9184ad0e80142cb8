#include "programs/vlmail/presets/nearest_name.h"

#include <algorithm>
#include <cctype>
#include <numeric>
#include <vector>

namespace VlMail {
namespace {

std::string lowered(std::string text) {
    std::transform(text.begin(), text.end(), text.begin(),
                   [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    return text;
}

/// Insertions, deletions, replacements and exchanges of neighbours that make one text of the other.
std::size_t distance(std::string const& a, std::string const& b) {
    std::vector<std::vector<std::size_t>> steps(a.size() + 1, std::vector<std::size_t>(b.size() + 1));
    for (std::size_t i = 0; i <= a.size(); ++i)
        steps[i][0] = i;
    std::iota(steps[0].begin(), steps[0].end(), std::size_t{0});
    for (std::size_t i = 1; i <= a.size(); ++i) {
        for (std::size_t j = 1; j <= b.size(); ++j) {
            std::size_t const replaced = steps[i - 1][j - 1] + (a[i - 1] == b[j - 1] ? 0 : 1);
            steps[i][j] = std::min({steps[i - 1][j] + 1, steps[i][j - 1] + 1, replaced});
            if (i > 1 && j > 1 && a[i - 1] == b[j - 2] && a[i - 2] == b[j - 1])
                steps[i][j] = std::min(steps[i][j], steps[i - 2][j - 2] + 1);
        }
    }
    return steps[a.size()][b.size()];
}

/// A short name leaves less room for errors than a long one.
std::size_t tolerance(std::string const& name) { return name.size() < 4 ? 1 : name.size() < 8 ? 2 : 3; }

} // namespace

std::string nearestName(std::string const& name, std::span<std::string const> candidates) {
    // Longer ones are no misspelling of anything, and the distance costs the product of the lengths.
    constexpr std::size_t MAX_NAME = 100;
    if (name.size() > MAX_NAME)
        return {};
    std::string const wanted = lowered(name);
    std::size_t best = tolerance(name) + 1;
    std::string nearest;
    for (std::string const& candidate : candidates) {
        if (candidate.size() > MAX_NAME)
            continue;
        std::size_t const found = distance(wanted, lowered(candidate));
        if (found < best) {
            best = found;
            nearest = candidate;
        }
    }
    return nearest;
}

} // namespace VlMail
