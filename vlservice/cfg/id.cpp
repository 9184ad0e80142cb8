#include "vlservice/cfg/id.h"

#include <boost/algorithm/string/split.hpp>

namespace Cfg {

namespace {
constexpr auto NONE = std::string::npos;
} // namespace

// Here and not inline in the header: the compiler of a program may disagree with the library's on whether
// such a text needs to be constructed at start, and then neither does it.
std::string const Id::ACCOUNT_PREFIX = "a=";
std::string const Id::GROUP_PREFIX = "ou=";
std::string const Id::USER_PREFIX = "u=";

Id::Id() : text_(1, CFG_ID_DELIM) {}

Id::Id(char const* path) : text_(path) { chkFixId(); }

bool Id::accountLevelOrBelow() const { return text_.find(ACCOUNT_PREFIX) != NONE; }

bool Id::isParentOrEqual(Id const& other) const {
    if (text_.size() > other.text_.size())
        return false;
    return text_.empty() || other.text_.find(text_) == other.text_.size() - text_.size();
}

std::vector<std::string> Id::tokens() const {
    std::vector<std::string> tokens;
    if (!text_.empty())
        boost::algorithm::split(tokens, text_, [](char c) { return c == CFG_ID_DELIM; });
    return tokens;
}

std::vector<Id> Id::allIds() const {
    std::vector<Id> ids{*this};
    if (text_.empty())
        return ids;
    for (auto slash = text_.find(CFG_ID_DELIM); slash != NONE; slash = text_.find(CFG_ID_DELIM, slash + 1))
        ids.emplace_back(text_.substr(slash + 1), false);
    ids.emplace_back(std::string(), false);
    return ids;
}

std::string Id::tokenValue(std::string const& token) {
    auto const symbol = token.find(TYPE_SYMBOL);
    return symbol == NONE ? token : token.substr(symbol + 1);
}

bool Id::isTokenWithType(std::string const& token) {
    return token.find(CFG_ID_DELIM) == NONE && token.find(TYPE_SYMBOL) != NONE;
}

void Id::chkFixId() {
    if (text_.empty())
        return;
    text_.erase(0, text_.find_first_not_of(CFG_ID_DELIM));
    if (!text_.starts_with(USER_PREFIX) && !tokenHasType(0))
        text_.insert(0, USER_PREFIX);
    addGroupAndAccountTypes();
    if (!accountLevelOrBelow() && text_.back() != CFG_ID_DELIM)
        text_ += CFG_ID_DELIM;
}

void Id::addGroupAndAccountTypes() {
    std::vector<std::size_t> untyped;
    // A slash right behind another is no delimiter.
    for (auto slash = text_.find(CFG_ID_DELIM); slash != NONE; slash = text_.find(CFG_ID_DELIM, slash + 2)) {
        if (!tokenHasType(slash + 1))
            untyped.push_back(slash + 1);
    }
    std::string typed;
    std::size_t taken = 0;
    for (std::size_t const token : untyped) {
        typed.append(text_, taken, token - taken);
        typed += token == untyped.back() ? ACCOUNT_PREFIX : GROUP_PREFIX;
        taken = token;
    }
    typed.append(text_, taken);
    text_ = std::move(typed);
}

void Id::makeChildOf(Id const& parent) {
    if (!tokenHasType(0))
        text_.insert(0, USER_PREFIX);
    if (!parent.text_.empty())
        text_ += CFG_ID_DELIM + parent.text_;
}

std::string Id::tokenName(std::string const& prefix) const {
    auto const found = text_.find(prefix);
    if (found == NONE)
        return {};
    auto const begin = found + prefix.size();
    // An empty name takes the slash behind it along, and what follows up to the next one.
    return text_.substr(begin, text_.find(CFG_ID_DELIM, begin + 1) - begin);
}

bool Id::tokenHasType(std::size_t pos) const {
    for (std::size_t i = pos + 1; i < text_.size() && text_[i] != CFG_ID_DELIM; ++i) {
        if (text_[i] == TYPE_SYMBOL)
            return true;
    }
    return false;
}

} // namespace Cfg
