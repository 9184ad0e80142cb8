#include "programs/vlserviced/store/node_id.h"

#include "programs/base/error.h"
#include "vlservice/cfg/id.h"

#include <algorithm>
#include <vector>

namespace VlServiced {
namespace {

enum class TokenKind { User, Group, Account, None };

/// An id for a message: what a sender put into it must not break the line or flood it.
std::string shown(std::string const& id) {
    constexpr std::size_t SHOWN_BYTES = 80;
    std::string text = id.substr(0, SHOWN_BYTES);
    std::replace_if(
        text.begin(), text.end(), [](unsigned char c) { return c < 0x20 || c >= 0x7F; }, '?');
    return '"' + text + (id.size() > SHOWN_BYTES ? "...\"" : "\"");
}

[[noreturn]] void refuse(std::string const& id, std::string const& why) {
    throw Base::Error(Base::Code::NodeInvalid, "node id " + shown(id) + " is not valid: " + why);
}

/// The kind of a token whose name is not empty.
TokenKind kindOf(std::string const& token) {
    auto const hasName = [&token](std::string const& prefix) {
        return token.size() > prefix.size() && token.compare(0, prefix.size(), prefix) == 0;
    };
    return hasName(Cfg::Id::USER_PREFIX)      ? TokenKind::User
           : hasName(Cfg::Id::GROUP_PREFIX)   ? TokenKind::Group
           : hasName(Cfg::Id::ACCOUNT_PREFIX) ? TokenKind::Account
                                              : TokenKind::None;
}

/// Whether a token of this kind may stand at this place; `isLast` counts the empty token of a closing slash.
bool mayStand(TokenKind kind, bool isFirst, bool isLast) {
    switch (kind) {
    case TokenKind::User:
        return isFirst && !isLast;
    case TokenKind::Group:
        return !isLast;
    case TokenKind::Account:
        return isLast;
    case TokenKind::None:
        return false;
    }
    return false;
}

} // namespace

void checkNodeId(std::string const& id) {
    if (id.size() > MAX_NODE_ID_BYTES)
        refuse(id, "it is longer than " + std::to_string(MAX_NODE_ID_BYTES) + " bytes");
    if (std::any_of(id.begin(), id.end(), [](unsigned char c) { return c < 0x20 || c == 0x7F; }))
        refuse(id, "it holds control characters");
    if (static_cast<std::size_t>(std::count(id.begin(), id.end(), Cfg::Id::CFG_ID_DELIM)) >=
        MAX_NODE_ID_TOKENS)
        refuse(id, "it has more than " + std::to_string(MAX_NODE_ID_TOKENS) + " tokens");
    std::vector<std::string> const tokens = Cfg::Id(id, false).tokens();
    for (std::size_t i = 0; i < tokens.size(); ++i) {
        bool const isLast = i + 1 == tokens.size();
        bool const closes = isLast && i > 0 && tokens[i].empty();
        if (!closes && !mayStand(kindOf(tokens[i]), i == 0, isLast))
            refuse(id, "wanted is a path like u=NAME/ou=GROUP/a=ACCOUNT, or the same without its front");
    }
}

std::string parentNodeId(std::string const& id) {
    auto const slash = id.find(Cfg::Id::CFG_ID_DELIM);
    return slash == std::string::npos ? std::string() : id.substr(slash + 1);
}

} // namespace VlServiced
