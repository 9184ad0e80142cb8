#pragma once
// Patterns of settings under examination: where one is broken, which groups it has, what it fits, and how
// hard it works for that. The settings' own classes run the same engine with the same options, but answer
// with yes or no.

#include "programs/base/error.h"

#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

namespace Patterns {

/// A pattern that cannot be compiled, in the engine's words; `position` counts characters from its start.
class Broken : public Base::Error {
public:
    Broken(std::string const& reason, std::size_t at)
        : Error(Base::Code::PatternInvalid, reason), position(at) {}

    std::size_t position;
};

/// A compiled pattern. Texts are UTF-8; one that is not fits nothing.
class Pattern {
public:
    /// What a pattern is for decides the options that it is compiled and run with.
    enum class Use {
        Name,     ///< over the whole name of a document, without regard to case
        Extract,  ///< searched for in the text of a zone
        Validate, ///< over the whole of a value
    };

    enum class Answer {
        Yes,
        No,
        /// The budget was used up, or the engine gave up before that.
        TooHard,
    };

    /// More than any text needs that a pattern takes in linear or quadratic time.
    static constexpr std::size_t DEFAULT_BUDGET = 2'000'000;

    /// Throws Broken.
    Pattern(std::string_view pattern, Use use);
    Pattern(Pattern&&) noexcept;
    ~Pattern();

    std::string const& text() const { return text_; }
    Use use() const { return use_; }

    bool hasGroup(std::string const& name) const;

    /// Looks at no more than `budget` characters, counting each look; so it ends soon whatever the pattern.
    Answer fits(std::string_view text, std::size_t budget = DEFAULT_BUDGET) const;
    /// How many looks at characters the answer takes, `budget` when it is not found within it.
    std::size_t cost(std::string_view text, std::size_t budget = DEFAULT_BUDGET) const;
    /// Bytes of a text.
    struct Place {
        std::size_t offset;
        std::size_t length;
    };
    /// Where it fits first; nothing when it does not, or not within the budget.
    std::optional<Place> find(std::string_view text, std::size_t budget = DEFAULT_BUDGET) const;
    /// Whether the pattern fits with that group taking part.
    bool fitsWithGroup(std::string_view text, std::string const& group) const;

private:
    struct Compiled;

    std::string text_;
    Use use_;
    std::unique_ptr<Compiled const> compiled_;
};

} // namespace Patterns
