#include "vlservice/extract/regex.h"

#include "vlservice/extract/compile_pattern.h"
#include "vlservice/extract/match_clock.h"

#include <unicode/uclean.h>

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

/// Walks a text and tells the clock of each step.
template<typename Inner>
class Clocked {
public:
    using iterator_category = std::bidirectional_iterator_tag;
    using value_type = UChar32;
    using difference_type = std::ptrdiff_t;
    using pointer = UChar32 const*;
    using reference = UChar32;

    Clocked() = default;
    explicit Clocked(Inner inner) : inner_(inner) {}

    UChar32 operator*() const { return *inner_; }
    Clocked& operator++() {
        matchClock.step();
        ++inner_;
        return *this;
    }
    Clocked operator++(int) {
        Clocked const before = *this;
        ++*this;
        return before;
    }
    Clocked& operator--() {
        matchClock.step();
        --inner_;
        return *this;
    }
    Clocked operator--(int) {
        Clocked const before = *this;
        --*this;
        return before;
    }
    friend bool operator==(Clocked const& a, Clocked const& b) { return a.inner_ == b.inner_; }
    friend bool operator!=(Clocked const& a, Clocked const& b) { return a.inner_ != b.inner_; }

    Inner const& inner() const { return inner_; }

private:
    Inner inner_ = {};
};

/// A place in UTF-8, as the engine's decoder takes it, which is asked only where there is more than ASCII.
class Utf8Place {
public:
    Utf8Place() = default;
    explicit Utf8Place(char const* at) : at_(at) {}

    UChar32 operator*() const { return isAscii(*at_) ? *at_ : *Decoder(at_); }
    Utf8Place& operator++() {
        at_ = isAscii(*at_) ? at_ + 1 : (++Decoder(at_)).base();
        return *this;
    }
    Utf8Place& operator--() {
        at_ = isAscii(at_[-1]) ? at_ - 1 : (--Decoder(at_)).base();
        return *this;
    }
    friend bool operator==(Utf8Place a, Utf8Place b) { return a.at_ == b.at_; }
    friend bool operator!=(Utf8Place a, Utf8Place b) { return a.at_ != b.at_; }

    char const* base() const { return at_; }

private:
    static bool isAscii(char c) { return static_cast<signed char>(c) >= 0; }

    char const* at_ = nullptr;
};

/// The matchers run on it as it is: the engine's own wrappers for UTF-8 copy all groups once more.
using ClockedDecoder = Clocked<Utf8Place>;
using ClockedPoints = Clocked<UChar32 const*>;

/// Throws std::out_of_range when the text begins or ends within a character.
void requireWholeEnds(std::string_view text) {
    static_cast<void>(Decoder(text.data(), text.data(), text.data() + text.size()));
}

ClockedDecoder decoderAt(char const* at) { return ClockedDecoder(Utf8Place(at)); }

using Groups = boost::match_results<ClockedDecoder>;

std::string_view piece(boost::sub_match<ClockedDecoder> const& group) {
    char const* const first = group.first.inner().base();
    return {first, static_cast<std::size_t>(group.second.inner().base() - first)};
}

/// A string, since the names in use fit into one without an allocation.
std::basic_string<UChar32> pointsOf(std::string_view name) { return {name.begin(), name.end()}; }

/// The numbers of the groups that a pattern gives that name.
std::vector<int> groupsNamed(boost::u32regex const& regex, std::string_view name) {
    auto const points = pointsOf(name);
    auto const [first, last] = regex.get_data().equal_range(points.data(), points.data() + points.size());
    std::vector<int> numbers;
    for (auto group = first; group != last; ++group)
        numbers.push_back(group->index);
    return numbers;
}

} // namespace

struct RegexGroups::Results {
    Groups groups;
};

RegexGroups::RegexGroups(std::unique_ptr<Results const> results) : results_(std::move(results)) {}
RegexGroups::RegexGroups(RegexGroups&& other) noexcept = default;
RegexGroups::~RegexGroups() = default;

std::optional<std::string_view> RegexGroups::group(std::string_view name) const {
    auto const points = pointsOf(name);
    auto const& found = results_->groups.named_subexpression(points.data(), points.data() + points.size());
    return found.matched ? std::optional(piece(found)) : std::nullopt;
}

struct FieldRegex::Compiled {
    Compiled(std::string_view pattern, std::string_view group)
        : regex(compilePattern(pattern, boost::regex_constants::perl)), value(groupsNamed(regex, group)) {}

    /// The first of them that took part.
    std::optional<std::string_view> valueIn(Groups const& groups) const {
        for (int const number : value)
            if (auto const& found = groups[number]; found.matched)
                return piece(found);
        return std::nullopt;
    }

    boost::u32regex regex;
    /// Looked up once: names are found by their hash, which costs a twentieth of a short search.
    std::vector<int> value;
};

FieldRegex::FieldRegex(std::string_view pattern, std::string_view group)
    : compiled_(new Compiled(pattern, group)) {}
FieldRegex::~FieldRegex() = default;

std::optional<FieldRegex::Found> FieldRegex::search(std::string_view text) const {
    requireWholeEnds(text);
    Groups groups;
    if (!boost::regex_search(decoderAt(text.data()), decoderAt(text.data() + text.size()), groups,
                             compiled_->regex, boost::match_not_dot_newline))
        return std::nullopt;
    return Found{piece(groups[0]), compiled_->valueIn(groups)};
}

std::optional<RegexGroups> FieldRegex::match(std::string_view text) const {
    requireWholeEnds(text);
    auto found = std::make_unique<RegexGroups::Results>();
    if (!boost::regex_match(decoderAt(text.data()), decoderAt(text.data() + text.size()), found->groups,
                            compiled_->regex, boost::match_not_dot_newline))
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
    return boost::regex_match(ClockedPoints(points.data()), ClockedPoints(points.data() + points.size()),
                              compiled_->regex);
}

} // namespace Cfg
