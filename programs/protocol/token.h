#pragma once
// Access tokens that have names, as client and service speak of them: who may do what, at which nodes.

#include "vlservice/json/json.h"

#include <optional>
#include <string>
#include <vector>

namespace Protocol {

/// What the holder of a token may do; each may do what those in front of it may.
enum class Role {
    /// Sees settings, documents and jobs.
    Read,
    /// Sends mailings, and decides about jobs and their letters.
    Send,
    /// Changes settings and documents.
    Settings,
    /// Gives tokens out and reads the record of changes; at the root, also what is the service's own.
    Admin,
};

inline constexpr Role ALL_ROLES[] = {Role::Read, Role::Send, Role::Settings, Role::Admin};

/// "read"
char const* roleName(Role role);
/// Throws Error, which names all roles, when none has that name.
Role roleNamed(std::string const& name);

/// Asks for a new token.
struct TokenAddition {
    static constexpr char const* KIND = "add_token";
    static constexpr char const* IN_WORDS = "an addition of a token";

    std::string name;
    Role role = Role::Read;
    /// The id of the node that it covers, with all below it.
    std::string id;

    TokenAddition() = default;
    TokenAddition(std::string tokenName, Role what, std::string nodeId);
    /// Throws Error when there is no node, on a role that there is not, and on a wrong type.
    explicit TokenAddition(json::Object const& object);
    /// With "query", as the questions have it.
    json::Object serialize() const;

    struct Keys;
};

struct TokenAdditionAnswer {
    /// Which is told this once.
    std::string token;

    TokenAdditionAnswer() = default;
    explicit TokenAdditionAnswer(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

/// Asks for the tokens of all nodes that the asker's own covers.
struct TokensQuery {
    static constexpr char const* KIND = "tokens";

    json::Object serialize() const;
};

struct TokenReport {
    std::string name;
    Role role = Role::Read;
    std::string id;
    /// Seconds since the epoch; 0 for the one in the service's own file.
    long long added = 0;
    /// The name of the token of who gave it out; empty for that of the first start.
    std::string addedBy;

    TokenReport() = default;
    /// Throws Error on a role that there is not.
    explicit TokenReport(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

/// In the order of their names.
struct TokensAnswer {
    std::vector<TokenReport> tokens;

    TokensAnswer() = default;
    explicit TokensAnswer(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

/// Takes a token back. The answer tells which it was.
struct TokenRevocation {
    static constexpr char const* KIND = "revoke_token";
    static constexpr char const* IN_WORDS = "a revocation of a token";

    std::string name;

    TokenRevocation() = default;
    explicit TokenRevocation(std::string tokenName);
    /// Throws Error on a wrong type.
    explicit TokenRevocation(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

} // namespace Protocol
