#include "programs/patterns/why_not.h"

#include "programs/base/quoting.h"
#include "programs/base/utf8.h"
#include "programs/patterns/outline.h"
#include "programs/patterns/pattern.h"

#include <optional>

namespace Patterns {
namespace {

/// The longest beginning of the name that the pattern fits; nothing when there is none.
std::optional<std::string> longestBeginning(Pattern const& pattern, std::string const& name) {
    for (std::size_t length = name.size() + 1; length-- > 0;) {
        if (Base::isBetweenCharacters(name, length) &&
            pattern.fits(name.substr(0, length)) == Pattern::Answer::Yes)
            return name.substr(0, length);
    }
    return std::nullopt;
}

std::optional<std::string> fittedBy(std::string const& beginning, std::string const& name) {
    try {
        return longestBeginning(Pattern("(?:" + beginning + ")", Pattern::Use::Name), name);
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
WhyNot whyNot(Sequence const& pieces, std::string const& name) {
    std::string beginning;
    std::string fitted;
    for (Piece const& piece : pieces) {
        beginning += piece.text;
        auto const longer = fittedBy(beginning, name);
        if (!longer)
            return failsAt(piece.text, fitted);
        fitted = *longer;
    }
    return endsEarly(fitted, name);
}

} // namespace

WhyNot whyNot(std::string const& expression, std::string const& name) {
    if (expression.empty())
        return {"an empty expression fits no name", {}, {}};
    std::optional<WhyNot> best;
    for (Sequence const& pieces : outlineOf(expression)) {
        WhyNot why = whyNot(withJoinedLiterals(pieces), name);
        if (!best || why.fitted.size() > best->fitted.size())
            best = std::move(why);
    }
    return *best;
}

} // namespace Patterns
