#include "programs/protocol/history.h"

#include "programs/protocol/query.h"
#include "programs/protocol/rows.h"

namespace Protocol {

struct HistoryQuery::Keys {
    static constexpr std::tuple TABLE{
        Asked{"limit", &HistoryQuery::limit, IntegerForm{1, MAX_ENTRIES}, MAX_ENTRIES},
    };
};

struct HistoryEntry::Keys {
    static constexpr std::tuple TABLE{
        Always{"at", &HistoryEntry::at},    Always{"who", &HistoryEntry::who},
        Always{NODE_ID, &HistoryEntry::id}, Always{"what", &HistoryEntry::what},
        Always{"was", &HistoryEntry::was},  Always{"is", &HistoryEntry::is},
    };
};

struct HistoryAnswer::Keys {
    static constexpr std::tuple TABLE{
        Always{"entries", &HistoryAnswer::entries},
    };
};

HistoryQuery::HistoryQuery(json::Object const& object) {
    if (object.get(NODE_ID))
        id = nodeIn(object, IN_WORDS);
    json::readKeys(Keys::TABLE, object, *this);
}

json::Object HistoryQuery::serialize() const {
    json::Object object = question(KIND);
    if (id)
        object.set(NODE_ID, *id);
    json::writeKeys(Keys::TABLE, *this, object);
    return object;
}

HistoryEntry::HistoryEntry(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object HistoryEntry::serialize() const { return writeRecord(*this); }

HistoryAnswer::HistoryAnswer(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object HistoryAnswer::serialize() const { return writeRecord(*this); }

} // namespace Protocol
