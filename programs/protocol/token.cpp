#include "programs/protocol/token.h"

#include "programs/base/error.h"
#include "programs/base/plain_text.h"
#include "programs/protocol/query.h"
#include "programs/protocol/rows.h"

#include <utility>

namespace Protocol {
namespace {

constexpr char const* ROLE = "role";

} // namespace

char const* roleName(Role role) {
    switch (role) {
    case Role::Read:
        return "read";
    case Role::Send:
        return "send";
    case Role::Settings:
        return "settings";
    case Role::Admin:
        break;
    }
    return "admin";
}

Role roleNamed(std::string const& name) {
    for (Role const role : ALL_ROLES)
        if (name == roleName(role))
            return role;
    throw Base::Error(Base::Code::RequestInvalid, "there is no role \"" + Base::plainLine(name) +
                                                      "\"; there are read, send, settings and admin");
}

struct TokenAddition::Keys {
    static constexpr std::tuple TABLE{
        Asked{"name", &TokenAddition::name, TextForm{}},
    };
};

struct TokenAdditionAnswer::Keys {
    static constexpr std::tuple TABLE{
        Always{"token", &TokenAdditionAnswer::token},
    };
};

struct TokenReport::Keys {
    static constexpr std::tuple TABLE{
        Always{"name", &TokenReport::name},
        Always{"id", &TokenReport::id},
        Always{"added", &TokenReport::added},
        Always{"added_by", &TokenReport::addedBy},
    };
};

struct TokensAnswer::Keys {
    static constexpr std::tuple TABLE{
        Always{"tokens", &TokensAnswer::tokens},
    };
};

struct TokenRevocation::Keys {
    static constexpr std::tuple TABLE{
        Asked{"name", &TokenRevocation::name, TextForm{}},
    };
};

TokenAddition::TokenAddition(std::string tokenName, Role what, std::string nodeId)
    : name(std::move(tokenName)), role(what), id(std::move(nodeId)) {}

TokenAddition::TokenAddition(json::Object const& object)
    : role(roleNamed(object.get(ROLE).textOrEmpty())), id(nodeIn(object, IN_WORDS)) {
    json::readKeys(Keys::TABLE, object, *this);
}

json::Object TokenAddition::serialize() const {
    json::Object object = question(KIND);
    object.set(NODE_ID, id);
    object.set(ROLE, roleName(role));
    json::writeKeys(Keys::TABLE, *this, object);
    return object;
}

TokenAdditionAnswer::TokenAdditionAnswer(json::Object const& object) {
    json::readKeys(Keys::TABLE, object, *this);
}
json::Object TokenAdditionAnswer::serialize() const { return writeRecord(*this); }

json::Object TokensQuery::serialize() const { return question(KIND); }

TokenReport::TokenReport(json::Object const& object) : role(roleNamed(object.get(ROLE).textOrEmpty())) {
    json::readKeys(Keys::TABLE, object, *this);
}

json::Object TokenReport::serialize() const {
    json::Object object = writeRecord(*this);
    object.set(ROLE, roleName(role));
    return object;
}

TokensAnswer::TokensAnswer(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object TokensAnswer::serialize() const { return writeRecord(*this); }

TokenRevocation::TokenRevocation(std::string tokenName) : name(std::move(tokenName)) {}
TokenRevocation::TokenRevocation(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }

json::Object TokenRevocation::serialize() const {
    json::Object object = question(KIND);
    json::writeKeys(Keys::TABLE, *this, object);
    return object;
}

} // namespace Protocol
