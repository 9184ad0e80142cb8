#include "vlservice/extract/compile_pattern.h"

#include <unicode/uchar.h>

#include <algorithm>
#include <array>
#include <cstddef>
#include <iterator>
#include <optional>

namespace Cfg {
namespace {

/// Zeroes behind the pattern: the parser looks ahead of a malformed one's end without asking for it.
constexpr std::size_t PADDING = 16;

/// Where the parser would run for ever: it does when a comment stands behind a possessive repeat, as in
/// "a?+(?#why)b". Blanks between them count for nothing, since a pattern may switch them off.
std::optional<std::ptrdiff_t> placeThatHangs(CodePoints const& pattern) {
    constexpr std::array<UChar32, 3> COMMENT{'(', '?', '#'};
    auto const first = pattern.begin();
    auto const behindLastSolid = [first](auto at) {
        while (at != first && u_isspace(at[-1]))
            --at;
        return at;
    };
    auto const endsIn = [first](auto at, std::string_view characters) {
        return at != first && at[-1] < 0x80 && characters.find(static_cast<char>(at[-1])) != characters.npos;
    };
    auto const comment = [&](auto from) {
        return std::search(from, pattern.end(), COMMENT.begin(), COMMENT.end());
    };
    for (auto at = comment(first); at != pattern.end(); at = comment(at + 1)) {
        auto const plus = behindLastSolid(at);
        if (endsIn(plus, "+") && endsIn(behindLastSolid(plus - 1), "*+?}"))
            return at - first;
    }
    return std::nullopt;
}

} // namespace

CodePoints decode(std::string_view utf8) {
    char const* const first = utf8.data();
    char const* const last = first + utf8.size();
    CodePoints points;
    points.reserve(utf8.size() + PADDING);
    std::copy(Decoder(first, first, last), Decoder(last, first, last), std::back_inserter(points));
    return points;
}

boost::u32regex compilePattern(std::string_view pattern, boost::regex_constants::syntax_option_type options) {
    CodePoints points = decode(pattern);
    if (auto const place = placeThatHangs(points))
        throw boost::regex_error("A comment stands behind a possessive repeat.",
                                 boost::regex_constants::error_badrepeat, *place);
    std::size_t const length = points.size();
    points.resize(length + PADDING);
    // Pointers to const, which are parsed where they point; any other iterators are copied first, without
    // padding.
    UChar32 const* const start = points.data();
    return boost::u32regex(start, start + length, options);
}

} // namespace Cfg
