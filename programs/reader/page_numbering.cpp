#include "programs/reader/page_numbering.h"

#include "programs/patterns/pattern.h"

#include <charconv>
#include <optional>

namespace Reader {
namespace {

/// Longer lines are sentences.
constexpr std::size_t MAX_LINE_BYTES = 120;
/// Told of a page; lists of pages have more.
constexpr std::size_t MOST = 4;

constexpr char const* PATTERN =
    R"((?i)(?<!\w)(?:page|seite|blatt|pagina|p\x{E1}gina|p\x{E1}g\.?|pag\.?|p\.|s\.)\h*\d{1,4}\h*(?:/|of|von|de|van|di|sur)\h*\d{1,4}(?!\d))"
    R"(|^(?:page|seite|blatt|pagina|p\x{E1}gina)\h*\d{1,4}$)"
    R"(|^\d{1,3}\h*/\h*\d{1,3}$)"
    R"(|^[-\x{2013}]\h*\d{1,3}\h*[-\x{2013}]$)";

int firstNumberIn(std::string_view text) {
    int number = 0;
    std::size_t const at = text.find_first_of("0123456789");
    std::from_chars(text.data() + at, text.data() + text.size(), number);
    return number;
}

std::optional<int> numberOf(std::string const& line) {
    static Patterns::Pattern const NUMBERING(PATTERN, Patterns::Pattern::Use::Extract);
    if (line.size() > MAX_LINE_BYTES || line.find_first_of("0123456789") == line.npos)
        return std::nullopt;
    auto const place = NUMBERING.find(line);
    if (!place)
        return std::nullopt;
    return firstNumberIn(std::string_view(line).substr(place->offset, place->length));
}

} // namespace

std::vector<PageNumbering> pageNumberingsOn(Page const& page, Layout const& layout) {
    std::vector<PageNumbering> found;
    for (Line const& line : layout.lines) {
        std::string text = textOf(page, line);
        if (auto const number = numberOf(text); number && found.size() < MOST)
            found.push_back({*number, std::move(text), line.box});
    }
    return found;
}

} // namespace Reader
