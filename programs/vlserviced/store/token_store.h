#pragma once
// The access tokens that the service has given out, as the database keeps them: what checks them, never the
// tokens themselves.

#include "programs/channel/proof.h"
#include "programs/database/connection.h"
#include "programs/policy/rights.h"

#include <optional>
#include <string>
#include <vector>

namespace VlServiced {

struct StoredToken {
    /// As Channel::tokenIdOf() tells it.
    std::string id;
    Policy::Grant grant;
    Channel::TokenKeys keys;
    /// Seconds since the epoch.
    long long addedAt = 0;
    /// The name of the token of who gave it out; empty for that of the first start.
    std::string addedBy;
    /// 0 while it holds.
    long long revokedAt = 0;
};

/// Of the tokens that hold no two have one name. Every change is one transaction and on the disk when the
/// operation returns.
class TokenStore {
public:
    /// The database has to outlive the store.
    explicit TokenStore(Database::Connection& database) : database_(database) {}

    /// Whether it holds or was revoked.
    std::optional<StoredToken> find(std::string const& id) const;
    /// The one that holds of that name.
    std::optional<StoredToken> named(std::string const& name) const;
    /// Those that hold, by their names.
    std::vector<StoredToken> all() const;

    /// False, and no change, when one of that name holds.
    bool add(StoredToken const& token);
    /// False, and no change, when none of that name holds.
    bool revoke(std::string const& name, long long now);

private:
    Database::Connection& database_;
};

} // namespace VlServiced
