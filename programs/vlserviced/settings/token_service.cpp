#include "programs/vlserviced/settings/token_service.h"

#include "programs/base/error.h"
#include "programs/base/plain_text.h"
#include "programs/channel/token.h"
#include "programs/vlserviced/store/node_id.h"

#include <algorithm>
#include <utility>

namespace VlServiced {
namespace {

using Policy::Grant;
using Protocol::Role;
using Protocol::roleName;
using Protocol::TokenReport;

constexpr std::size_t MAX_NAME_BYTES = 64;

Grant adminGrant() { return {TokenService::ADMIN, Role::Admin, {}}; }

void requireName(std::string const& name) {
    bool const isGood = !name.empty() && name.front() != '-' && name != TokenService::ADMIN &&
                        Base::isPlainText(name, MAX_NAME_BYTES) && Base::plainLine(name) == name &&
                        name.find_first_of(" \t") == std::string::npos;
    if (!isGood)
        throw Base::Error(Base::Code::NameInvalid,
                          "\"" + Base::oneLine(name) +
                              "\" cannot be the name of a token: give it one word of at most " +
                              std::to_string(MAX_NAME_BYTES) + " bytes, other than " + TokenService::ADMIN);
}

TokenReport reportOf(StoredToken const& token) {
    TokenReport report;
    report.name = token.grant.name;
    report.role = token.grant.role;
    report.id = token.grant.node;
    report.added = token.addedAt;
    report.addedBy = token.addedBy;
    return report;
}

} // namespace

TokenService::TokenService(TokenStore& tokens, std::string ownToken, std::function<long long()> now,
                           Recorder recorder)
    : tokens_(tokens), ownToken_(std::move(ownToken)), ownId_(Channel::tokenIdOf(ownToken_)),
      now_(std::move(now)), recorder_(recorder) {}

void TokenService::enrol() {
    if (!ownId_.empty())
        tokens_.add({ownId_, adminGrant(), Channel::keysOf(ownToken_), now_(), {}, 0});
}

std::optional<Channel::TokenKeys> TokenService::keysOf(std::string const& id) const {
    if (std::optional<StoredToken> const token = tokens_.find(id))
        return token->revokedAt == 0 ? std::optional(token->keys) : std::nullopt;
    return isOwn(id) ? std::optional(Channel::keysOf(ownToken_)) : std::nullopt;
}

std::optional<Grant> TokenService::grantOf(std::string const& id) const {
    std::string const& wanted = id.empty() ? ownId_ : id;
    if (std::optional<StoredToken> const token = tokens_.find(wanted); !wanted.empty() && token)
        return token->revokedAt == 0 ? std::optional(token->grant) : std::nullopt;
    return id.empty() || isOwn(id) ? std::optional(adminGrant()) : std::nullopt;
}

bool TokenService::isOwnUnlisted() const { return ownId_.empty() || !tokens_.find(ownId_); }

Protocol::TokenAdditionAnswer TokenService::add(Protocol::TokenAddition const& addition,
                                                Grant const& holder) {
    requireName(addition.name);
    checkNodeId(addition.id);
    if (std::string const refusal = Policy::refusalOfGranting(holder, addition.role, addition.id);
        !refusal.empty())
        throw Base::Error(Base::Code::NotAllowed, refusal);
    Protocol::TokenAdditionAnswer answer;
    answer.token = Channel::makeNamedToken();
    Grant const grant{addition.name, addition.role, addition.id};
    StoredToken const token{
        Channel::tokenIdOf(answer.token), grant, Channel::keysOf(answer.token), now_(), holder.name, 0};
    recorder_.together([&] {
        if (!tokens_.add(token))
            throw Base::Error(Base::Code::NameTaken,
                              "there is a token " + addition.name +
                                  " already: choose another name, or revoke that one first");
        recorder_.note(addition.id, "token " + addition.name, "", roleName(addition.role));
    });
    return answer;
}

Protocol::TokensAnswer TokenService::list(Grant const& holder) const {
    Protocol::TokensAnswer answer;
    if (holder.covers({}) && isOwnUnlisted()) {
        TokenReport& own = answer.tokens.emplace_back();
        own.name = ADMIN;
        own.role = Role::Admin;
    }
    for (StoredToken const& token : tokens_.all())
        if (holder.covers(token.grant.node))
            answer.tokens.push_back(reportOf(token));
    return answer;
}

TokenReport TokenService::revoke(Protocol::TokenRevocation const& revocation, Grant const& holder) {
    std::optional<StoredToken> const token = tokens_.named(revocation.name);
    if (!token && revocation.name == ADMIN && holder.covers({}))
        throw Base::Error(Base::Code::TokenNeeded,
                          "the token admin is the one in the service's own file: put another one there, and "
                          "start the service again");
    if (!token || !holder.covers(token->grant.node))
        throw Base::Error(Base::Code::TokenUnknown, "there is no token " + Base::oneLine(revocation.name) +
                                                        ": \"vlmail token list\" shows those that there are");
    requireAnotherAdmin(*token);
    recorder_.together([&] {
        tokens_.revoke(revocation.name, now_());
        recorder_.note(token->grant.node, "token " + revocation.name, roleName(token->grant.role), "");
    });
    return reportOf(*token);
}

/// Somebody has to be left who may give out tokens at the root.
void TokenService::requireAnotherAdmin(StoredToken const& revoked) const {
    std::vector<StoredToken> const all = tokens_.all();
    auto const isOther = [&](StoredToken const& token) {
        return token.id != revoked.id && token.grant.role == Role::Admin && token.grant.node.empty();
    };
    bool const isAdmin = revoked.grant.role == Role::Admin && revoked.grant.node.empty();
    if (isAdmin && !isOwnUnlisted() && std::none_of(all.begin(), all.end(), isOther))
        throw Base::Error(Base::Code::TokenNeeded,
                          "the token " + revoked.grant.name +
                              " is the last one with the role admin at the root: give out another one first");
}

} // namespace VlServiced
