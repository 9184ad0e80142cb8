#pragma once
// The name of a configuration node as a path text: u=bob/ou=sales/a=acme, the most specific token first.

#include "vlservice/export.h"
#include "vlservice/json/json.h"

#include <concepts>
#include <cstddef>
#include <string>
#include <utility>
#include <vector>

namespace Cfg {

/// A token is a type (u user, ou group, a account), "=" and a name; a parent's text is a tail of its child's.
/// The empty text is the root, above all accounts, and valid. A text with a leading slash is invalid. Any
/// text can be held, and no operation fails on it; a program that must not take the root for a missing id
/// tests the JSON value itself.
class VLSERVICE_EXPORT Id {
public:
    static std::string const ACCOUNT_PREFIX;  ///< in front of an account's name, "a="
    static std::string const GROUP_PREFIX;    ///< in front of a group's name, "ou="
    static std::string const USER_PREFIX;     ///< in front of a user's name, "u="
    static constexpr char TYPE_SYMBOL = '=';  ///< between a type and a name
    static constexpr char CFG_ID_DELIM = '/'; ///< between two tokens

    /// The invalid id, "/".
    Id();
    /// Takes a loosely typed path and completes it: "bob/sales/acme" becomes "u=bob/ou=sales/a=acme".
    Id(char const* path);
    /// Takes the text, completed as above when `fix` is true. The flag is exactly a bool: a pointer is none.
    template<std::same_as<bool> Flag>
    Id(std::string text, Flag fix) : text_(std::move(text)) {
        if (fix)
            chkFixId();
    }
    /// A child of `parent`. A name without a type is a user's; nothing else is completed. The parent is
    /// exactly an Id: a text would have to say whether it is to be completed.
    template<std::same_as<Id> Parent>
    Id(std::string name, Parent const& parent) : text_(std::move(name)) {
        makeChildOf(parent);
    }
    /// The text of a string, not completed. Anything else gives the empty text, which is the root.
    template<std::derived_from<json::Value> Node>
    Id(Node const& node) : text_(node.textOrEmpty()) {}
    Id(std::nullptr_t) = delete;

    std::string const& str() const { return text_; } ///< the path
    json::Value serialize() const { return text_; }
    friend bool operator==(Id const&, Id const&) = default;

    bool valid() const { return !invalid(); }                        ///< also for the root
    bool invalid() const { return text_.starts_with(CFG_ID_DELIM); } ///< a leading slash

    bool hasUser() const { return text_.starts_with(USER_PREFIX); } ///< a user's node
    static bool hasUserStr(std::string text) { return text.starts_with(USER_PREFIX); }
    /// True for everything that is no user, the root and the invalid id included.
    bool isParentId() const { return isParentIdStr(text_); }
    static bool isParentIdStr(std::string const& text) { return !text.starts_with(USER_PREFIX); }
    /// Deliberately a search for "a=" anywhere, also inside a name: u=maria=1/ counts.
    bool accountLevelOrBelow() const;

    /// Empty when there is no account.
    std::string accountName() const { return tokenName(ACCOUNT_PREFIX); }
    /// Empty when there is no user, with one deliberate exception that stored names depend on: "u=" is also
    /// found inside "ou=", so that a group's id answers with the name of its first group.
    std::string userName() const { return tokenName(USER_PREFIX); }

    /// Whether this text is a tail of the other's. A rule about texts, not about rights (for those see
    /// CfgNodeId::isParentOf): deliberately only the first occurrence counts, so a=x/ is no parent of
    /// a=x/a=x/.
    bool isParentOrEqual(Id const& other) const;

    /// The text split at every slash; the root has no token, a trailing slash gives an empty last one.
    std::vector<std::string> tokens() const;
    /// This id and all its tails, up to the root. For a text that ends in a slash the root stands there
    /// twice. Takes memory in the square of the text's length: limit that of ids from outside.
    std::vector<Id> allIds() const;

    /// What follows the first type symbol; the whole token when there is none.
    static std::string tokenValue(std::string const& token);
    /// True when the token has a type symbol and no slash.
    static bool isTokenWithType(std::string const& token);

private:
    /// The first token without a type is a user, the last one the account, those between are groups.
    /// Deliberately not the same twice: a path without an account ends in a slash, and fixed again its empty
    /// last token becomes the account.
    void chkFixId();
    void addGroupAndAccountTypes();
    void makeChildOf(Id const& parent);
    /// What follows the first occurrence of the prefix, wherever it is, up to a slash.
    std::string tokenName(std::string const& prefix) const;
    /// Whether the token at `pos` has a type; a type symbol as its very first character is none.
    bool tokenHasType(std::size_t pos) const;

    std::string text_;
};

} // namespace Cfg
