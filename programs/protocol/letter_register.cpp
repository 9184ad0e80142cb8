#include "programs/protocol/letter_register.h"

#include "programs/protocol/query.h"
#include "programs/protocol/rows.h"

namespace Protocol {

struct RegisterQuery::Keys {
    static constexpr std::tuple TABLE{
        Asked{"digests", &RegisterQuery::digests, TextsForm{MAX_DIGESTS}},
        Asked{"besides", &RegisterQuery::besides, TextsForm{MAX_PACKS}},
    };
};

struct RegisteredLetter::Keys {
    static constexpr std::tuple TABLE{
        Always{"digest", &RegisteredLetter::digest},
        Always{"at", &RegisteredLetter::at},
        Always{"pack", &RegisteredLetter::pack},
        Always{"state", &RegisteredLetter::state},
    };
};

struct RegisterAnswer::Keys {
    static constexpr std::tuple TABLE{
        Always{"letters", &RegisterAnswer::letters},
    };
};

RegisterQuery::RegisterQuery(json::Object const& object) : id(nodeIn(object, IN_WORDS)) {
    json::readKeys(Keys::TABLE, object, *this);
}

json::Object RegisterQuery::serialize() const {
    json::Object object = question(KIND);
    object.set(NODE_ID, id);
    json::writeKeys(Keys::TABLE, *this, object);
    return object;
}

RegisteredLetter::RegisteredLetter(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object RegisteredLetter::serialize() const { return writeRecord(*this); }

RegisterAnswer::RegisterAnswer(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object RegisterAnswer::serialize() const { return writeRecord(*this); }

} // namespace Protocol
