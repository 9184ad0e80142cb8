#include "programs/vlserviced/store/token_store.h"

#include "programs/base/hex.h"

namespace VlServiced {
namespace {

constexpr char const* SELECT_TOKENS =
    "SELECT id, name, role, node, service_key, client_digest, added_at, added_by, revoked_at FROM tokens ";

std::string hex(std::string const& bytes) { return Base::toHex(bytes.data(), bytes.size()); }

StoredToken tokenIn(Database::Rows const& row) {
    StoredToken token;
    token.id = row.text(0);
    token.grant = {row.text(1), Protocol::roleNamed(row.text(2)), row.text(3)};
    token.keys = {Base::fromHex(row.bytes(4)).value_or(""), Base::fromHex(row.bytes(5)).value_or("")};
    token.addedAt = row.number(6);
    token.addedBy = row.text(7);
    token.revokedAt = row.number(8);
    return token;
}

std::optional<StoredToken> firstTokenIn(Database::Rows rows) {
    return rows.next() ? std::optional(tokenIn(rows)) : std::nullopt;
}

} // namespace

std::optional<StoredToken> TokenStore::find(std::string const& id) const {
    return firstTokenIn(database_.query(std::string(SELECT_TOKENS) + "WHERE id = $1", id));
}

std::optional<StoredToken> TokenStore::named(std::string const& name) const {
    return firstTokenIn(
        database_.query(std::string(SELECT_TOKENS) + "WHERE name = $1 AND revoked_at = 0", name));
}

std::vector<StoredToken> TokenStore::all() const {
    Database::Rows rows = database_.query(std::string(SELECT_TOKENS) + "WHERE revoked_at = 0 ORDER BY name");
    std::vector<StoredToken> tokens;
    while (rows.next())
        tokens.push_back(tokenIn(rows));
    return tokens;
}

bool TokenStore::add(StoredToken const& token) {
    return database_.change("INSERT INTO tokens (id, name, role, node, service_key, client_digest, added_at, "
                            "added_by, revoked_at) VALUES ($1, $2, $3, $4, $5, $6, $7, $8, 0) "
                            "ON CONFLICT DO NOTHING",
                            token.id, token.grant.name, Protocol::roleName(token.grant.role),
                            token.grant.node, hex(token.keys.service), hex(token.keys.clientDigest),
                            token.addedAt, token.addedBy) == 1;
}

bool TokenStore::revoke(std::string const& name, long long now) {
    return database_.change("UPDATE tokens SET revoked_at = $1 WHERE name = $2 AND revoked_at = 0", now,
                            name) == 1;
}

} // namespace VlServiced
