#pragma once
// Who is let in, and what he may do: the tokens that were given out, and the one in the service's own file.

#include "programs/channel/greeting.h"
#include "programs/protocol/token.h"
#include "programs/vlserviced/store/history.h"
#include "programs/vlserviced/store/token_store.h"

#include <functional>
#include <optional>
#include <string>

namespace VlServiced {

/// The token in the service's file has the name ADMIN and the role admin at the root. One that the first
/// start made is among those that were given out, and can be revoked as they can.
class TokenService {
public:
    static constexpr char const* ADMIN = "admin";

    /// All have to outlive the service. `ownToken` is that of the file.
    TokenService(TokenStore& tokens, std::string ownToken, std::function<long long()> now,
                 Recorder recorder = {});

    /// Puts the token of the file among those that were given out, as the first start does.
    void enrol();

    /// What checks a token that holds; asked with each greeting.
    std::optional<Channel::TokenKeys> keysOf(std::string const& id) const;
    /// What the token of that id may do at that moment, the empty text being that of the file. Nothing when
    /// it was revoked.
    std::optional<Policy::Grant> grantOf(std::string const& id) const;

    // Each throws Error when the holder may not, or it cannot be done.
    Protocol::TokenAdditionAnswer add(Protocol::TokenAddition const& addition, Policy::Grant const& holder);
    Protocol::TokensAnswer list(Policy::Grant const& holder) const;
    Protocol::TokenReport revoke(Protocol::TokenRevocation const& revocation, Policy::Grant const& holder);

private:
    bool isOwn(std::string const& id) const { return !ownId_.empty() && id == ownId_; }
    /// Whether the file's token is none of those that were given out, so that nothing but the file says of
    /// it.
    bool isOwnUnlisted() const;
    void requireAnotherAdmin(StoredToken const& revoked) const;

    TokenStore& tokens_;
    std::string ownToken_;
    std::string ownId_;
    std::function<long long()> now_;
    Recorder recorder_;
};

} // namespace VlServiced
