#include "programs/patterns/why_not.h"

#include "programs/base/quoting.h"
#include "programs/base/utf8.h"
#include "programs/patterns/outline.h"
#include "programs/patterns/pattern.h"

#include <optional>
#include <utility>

namespace Patterns {
namespace {

using Clock = std::chrono::steady_clock;

struct PatienceSpent {};

/// The longest beginning of the name that the pattern fits; nothing when there is none.
std::optional<std::string> longestBeginning(Pattern const& pattern, std::string const& name,
                                            Clock::time_point deadline) {
    for (std::size_t length = name.size() + 1; length-- > 0;) {
        if (Clock::now() >= deadline)
            throw PatienceSpent();
        if (Base::isBetweenCharacters(name, length) &&
            pattern.fits(name.substr(0, length)) == Pattern::Answer::Yes)
            return name.substr(0, length);
    }
    return std::nullopt;
}

std::optional<std::string> fittedBy(std::string const& beginning, std::string const& name,
                                    Clock::time_point deadline) {
    try {
        return longestBeginning(Pattern("(?:" + beginning + ")", Pattern::Use::Name), name, deadline);
    } catch (Broken const&) {
        return std::nullopt;
    }
}

WhyNot endsEarly(std::string const& fitted, std::string const& name) {
    return {"it must fit the whole name, and ends before " + Base::inQuotes(name.substr(fitted.size())),
            {},
            fitted};
}

WhyNot failsAt(std::string const& part, std::string const& fitted) {
    if (fitted.empty())
        return {"the name does not begin with " + Base::inQuotes(part), part, fitted};
    return {Base::inQuotes(part) + " does not fit behind " + Base::inQuotes(fitted), part, fitted};
}

/// How far the pieces get, one after the other.
WhyNot whyNot(Sequence const& pieces, std::string const& name, Clock::time_point deadline) {
    std::string beginning;
    std::string fitted;
    for (Piece const& piece : pieces) {
        beginning += piece.text;
        auto const longer = fittedBy(beginning, name, deadline);
        if (!longer)
            return failsAt(piece.text, fitted);
        fitted = *longer;
    }
    return endsEarly(fitted, name);
}

/// The alternative that gets furthest.
WhyNot furthest(std::string const& expression, std::string const& name, Clock::time_point deadline) {
    std::optional<WhyNot> best;
    for (Sequence const& pieces : outlineOf(expression)) {
        WhyNot why = whyNot(withJoinedLiterals(pieces), name, deadline);
        if (!best || why.fitted.size() > best->fitted.size())
            best = std::move(why);
    }
    return *best;
}

} // namespace

WhyNot whyNot(std::string const& expression, std::string const& name, Clock::duration patience) {
    if (expression.empty())
        return {"an empty expression fits no name", {}, {}};
    try {
        return furthest(expression, name, Clock::now() + patience);
    } catch (PatienceSpent const&) {
        return {"it does not fit, and it takes too long to tell where", {}, {}};
    }
}

} // namespace Patterns
