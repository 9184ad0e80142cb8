#include "vlservice/extract/regex.h"

#include <boost/regex/icu.hpp>
#include <unicode/uchar.h>
#include <unicode/uclean.h>

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdlib>
#include <iterator>
#include <utility>
#include <vector>

extern "C" {
static void releaseUnicodeTables() { u_cleanup(); }
}

namespace Cfg {

namespace {

// Registered at load, so that it runs behind the destructors of everything that was built by the library's
// users.
[[maybe_unused]] int const CLEANUP_AT_EXIT = std::atexit(releaseUnicodeTables);

using CodePoints = std::vector<UChar32>;
using Decoder = boost::u8_to_u32_iterator<char const*, UChar32>;

/// Zeroes behind the last code point that do not count as part of it.
constexpr std::size_t NO_PADDING = 0;
// The parser of patterns looks ahead of a malformed one's end without asking for it.
constexpr std::size_t PATTERN_PADDING = 16;

CodePoints decode(std::string_view utf8, std::size_t padding) {
    char const* const first = utf8.data();
    char const* const last = first + utf8.size();
    CodePoints points;
    points.reserve(utf8.size() + padding);
    std::copy(Decoder(first, first, last), Decoder(last, first, last), std::back_inserter(points));
    points.resize(points.size() + padding);
    return points;
}

/// Whether the parser of patterns would run for ever: it does when a comment stands behind a possessive
/// repeat, as in "a?+(?#why)b". Blanks between them count for nothing, since a pattern may switch them off.
bool hangsTheParser(CodePoints const& pattern) {
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
            return true;
    }
    return false;
}

boost::u32regex compile(std::string_view pattern, boost::regex_constants::syntax_option_type options) {
    CodePoints const points = decode(pattern, PATTERN_PADDING);
    if (hangsTheParser(points))
        throw boost::regex_error("A comment stands behind a possessive repeat.",
                                 boost::regex_constants::error_badrepeat, 0);
    // Pointers to const, which are parsed where they point; any other iterators are copied first, without
    // padding.
    UChar32 const* const first = points.data();
    return boost::u32regex(first, first + points.size() - PATTERN_PADDING, options);
}

// The matchers run on decoding iterators as they are: the engine's own wrappers for UTF-8 copy all groups
// once more.
using Groups = boost::match_results<Decoder>;

std::string_view piece(boost::sub_match<Decoder> const& group) {
    char const* const first = group.first.base();
    return {first, static_cast<std::size_t>(group.second.base() - first)};
}

std::optional<std::string_view> groupNamed(Groups const& groups, std::string_view name) {
    // A string, since the names in use fit into one without an allocation.
    std::basic_string<UChar32> const points(name.begin(), name.end());
    auto const& found = groups.named_subexpression(points.data(), points.data() + points.size());
    return found.matched ? std::optional(piece(found)) : std::nullopt;
}

} // namespace

struct RegexGroups::Results {
    Groups groups;
};

RegexGroups::RegexGroups(std::unique_ptr<Results const> results) : results_(std::move(results)) {}
RegexGroups::RegexGroups(RegexGroups&& other) noexcept = default;
RegexGroups::~RegexGroups() = default;

std::optional<std::string_view> RegexGroups::group(std::string_view name) const {
    return groupNamed(results_->groups, name);
}

struct FieldRegex::Compiled {
    boost::u32regex regex;
};

FieldRegex::FieldRegex(std::string_view pattern)
    : compiled_(new Compiled{compile(pattern, boost::regex_constants::perl)}) {}
FieldRegex::~FieldRegex() = default;

std::optional<FieldRegex::Found> FieldRegex::search(std::string_view text, std::string_view group) const {
    char const* const first = text.data();
    char const* const last = first + text.size();
    Groups groups;
    if (!boost::regex_search(Decoder(first, first, last), Decoder(last, first, last), groups,
                             compiled_->regex, boost::match_not_dot_newline))
        return std::nullopt;
    return Found{piece(groups[0]), groupNamed(groups, group)};
}

std::optional<RegexGroups> FieldRegex::match(std::string_view text) const {
    char const* const first = text.data();
    char const* const last = first + text.size();
    auto found = std::make_unique<RegexGroups::Results>();
    if (!boost::regex_match(Decoder(first, first, last), Decoder(last, first, last), found->groups,
                            compiled_->regex, boost::match_not_dot_newline))
        return std::nullopt;
    return RegexGroups(std::move(found));
}

struct NameRegex::Compiled {
    boost::u32regex regex;
};

NameRegex::NameRegex(std::string_view pattern)
    : compiled_(
          new Compiled{compile(pattern, boost::regex_constants::perl | boost::regex_constants::icase)}) {}
NameRegex::~NameRegex() = default;

bool NameRegex::matches(std::string_view name) const {
    CodePoints const points = decode(name, NO_PADDING);
    return boost::regex_match(points.data(), points.data() + points.size(), compiled_->regex);
}

} // namespace Cfg
