#include "programs/patterns/pattern.h"

#include "programs/base/utf8.h"
#include "programs/patterns/paying_iterator.h"
#include "vlservice/extract/compile_pattern.h"

#include <algorithm>
#include <utility>

namespace Patterns {
namespace {

using Groups = boost::match_results<PayingIterator>;

boost::u32regex compile(std::string_view pattern, Pattern::Use use) {
    boost::regex_constants::syntax_option_type const caseless =
        use == Pattern::Use::Name ? boost::regex_constants::icase : 0;
    return Cfg::compilePattern(pattern, boost::regex_constants::perl | caseless);
}

/// The engine's words go on with the pattern around the fault, which is said by its position instead.
std::string reasonOf(boost::regex_error const& error) {
    std::string reason = error.what();
    reason.erase(std::min(reason.find("  The error occurred"), reason.size()));
    if (reason.ends_with('.'))
        reason.pop_back();
    return reason;
}

} // namespace

struct Pattern::Compiled {
    boost::u32regex regex;

    Answer run(Use use, Cfg::CodePoints const& text, Budget& budget, Groups& groups) const {
        PayingIterator const first(text.data(), budget);
        PayingIterator const last(text.data() + text.size(), budget);
        auto const flags = use == Use::Name ? boost::match_default : boost::match_not_dot_newline;
        try {
            bool const found = use == Use::Extract ? boost::regex_search(first, last, groups, regex, flags)
                                                   : boost::regex_match(first, last, groups, regex, flags);
            return found ? Answer::Yes : Answer::No;
        } catch (BudgetSpent const&) {
            return Answer::TooHard;
        } catch (std::runtime_error const&) {
            budget.left = 0;
            return Answer::TooHard;
        }
    }
};

Pattern::Pattern(std::string_view pattern, Use use) : text_(pattern), use_(use) {
    try {
        compiled_ = std::make_unique<Compiled>(Compiled{compile(pattern, use)});
    } catch (boost::regex_error const& error) {
        throw Broken(reasonOf(error), static_cast<std::size_t>(error.position()));
    } catch (std::out_of_range const& error) {
        throw Broken(error.what(), 0);
    }
}

Pattern::Pattern(Pattern&&) noexcept = default;
Pattern::~Pattern() = default;

bool Pattern::hasGroup(std::string const& name) const {
    try {
        // The engine refuses to refer back to a group that is not there.
        compile(text_ + "\\k<" + name + '>', use_);
        return true;
    } catch (boost::regex_error const&) {
        return false;
    }
}

Pattern::Answer Pattern::fits(std::string_view text, std::size_t budget) const {
    try {
        Budget purse{budget};
        Groups groups;
        return compiled_->run(use_, Cfg::decode(text), purse, groups);
    } catch (std::out_of_range const&) {
        return Answer::No;
    }
}

std::size_t Pattern::cost(std::string_view text, std::size_t budget) const {
    Budget purse{budget};
    Groups groups;
    compiled_->run(use_, Cfg::decode(text), purse, groups);
    return budget - purse.left;
}

std::optional<Pattern::Place> Pattern::find(std::string_view text, std::size_t budget) const {
    try {
        Budget purse{budget};
        Groups groups;
        if (compiled_->run(use_, Cfg::decode(text), purse, groups) != Answer::Yes)
            return std::nullopt;
        auto const bytesOf = [](std::string_view in, std::ptrdiff_t characters) {
            return Base::firstCharacters(in, static_cast<std::size_t>(characters)).size();
        };
        std::size_t const begin = bytesOf(text, groups.position());
        return Place{begin, bytesOf(text.substr(begin), groups.length())};
    } catch (std::out_of_range const&) {
        return std::nullopt;
    }
}

bool Pattern::fitsWithGroup(std::string_view text, std::string const& group) const {
    try {
        Budget purse{DEFAULT_BUDGET};
        Groups groups;
        return compiled_->run(use_, Cfg::decode(text), purse, groups) == Answer::Yes &&
               groups[group.c_str()].matched;
    } catch (std::out_of_range const&) {
        return false;
    }
}

} // namespace Patterns
