#include "vlservice/extract/regex.h"

#include "vlservice/extract/compile_pattern.h"
#include "vlservice/extract/match_clock.h"

#include <unicode/uclean.h>

#include <cstddef>
#include <cstdlib>
#include <iterator>
#include <utility>

extern "C" {
static void releaseUnicodeTables() { u_cleanup(); }
}

namespace Cfg {

namespace {

// Registered at load, so that it runs behind the destructors of everything that was built by the library's
// users.
[[maybe_unused]] int const CLEANUP_AT_EXIT = std::atexit(releaseUnicodeTables);

/// Decodes UTF-8 and tells the clock of each step. The matchers run on it as it is: the engine's own wrappers
/// for UTF-8 copy all groups once more.
class ClockedDecoder {
public:
    using iterator_category = std::bidirectional_iterator_tag;
    using value_type = UChar32;
    using difference_type = std::ptrdiff_t;
    using pointer = UChar32 const*;
    using reference = UChar32;

    ClockedDecoder() = default;
    ClockedDecoder(char const* at, char const* first, char const* last) : decoder_(at, first, last) {}

    UChar32 operator*() const { return *decoder_; }
    ClockedDecoder& operator++() {
        matchClock.step();
        ++decoder_;
        return *this;
    }
    ClockedDecoder operator++(int) {
        ClockedDecoder const before = *this;
        ++*this;
        return before;
    }
    ClockedDecoder& operator--() {
        matchClock.step();
        --decoder_;
        return *this;
    }
    ClockedDecoder operator--(int) {
        ClockedDecoder const before = *this;
        --*this;
        return before;
    }
    friend bool operator==(ClockedDecoder const& a, ClockedDecoder const& b) {
        return a.decoder_ == b.decoder_;
    }
    friend bool operator!=(ClockedDecoder const& a, ClockedDecoder const& b) {
        return a.decoder_ != b.decoder_;
    }

    char const* base() const { return decoder_.base(); }

private:
    Decoder decoder_;
};

using Groups = boost::match_results<ClockedDecoder>;

std::string_view piece(boost::sub_match<ClockedDecoder> const& group) {
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
    : compiled_(new Compiled{compilePattern(pattern, boost::regex_constants::perl)}) {}
FieldRegex::~FieldRegex() = default;

std::optional<FieldRegex::Found> FieldRegex::search(std::string_view text, std::string_view group) const {
    char const* const first = text.data();
    char const* const last = first + text.size();
    Groups groups;
    if (!boost::regex_search(ClockedDecoder(first, first, last), ClockedDecoder(last, first, last), groups,
                             compiled_->regex, boost::match_not_dot_newline))
        return std::nullopt;
    return Found{piece(groups[0]), groupNamed(groups, group)};
}

std::optional<RegexGroups> FieldRegex::match(std::string_view text) const {
    char const* const first = text.data();
    char const* const last = first + text.size();
    auto found = std::make_unique<RegexGroups::Results>();
    if (!boost::regex_match(ClockedDecoder(first, first, last), ClockedDecoder(last, first, last),
                            found->groups, compiled_->regex, boost::match_not_dot_newline))
        return std::nullopt;
    return RegexGroups(std::move(found));
}

struct NameRegex::Compiled {
    boost::u32regex regex;
};

NameRegex::NameRegex(std::string_view pattern)
    : compiled_(new Compiled{
          compilePattern(pattern, boost::regex_constants::perl | boost::regex_constants::icase)}) {}
NameRegex::~NameRegex() = default;

bool NameRegex::matches(std::string_view name) const {
    CodePoints const points = decode(name);
    return boost::regex_match(points.data(), points.data() + points.size(), compiled_->regex);
}

} // namespace Cfg
