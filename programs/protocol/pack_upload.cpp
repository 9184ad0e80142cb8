#include "programs/protocol/pack_upload.h"

#include "programs/protocol/query.h"
#include "programs/protocol/rows.h"

namespace Protocol {

struct BeginPack::Keys {
    static constexpr std::tuple TABLE{
        Asked{"id", &BeginPack::id, TextForm{}},
        Asked{CFG_ID, &BeginPack::cfgId, TextForm{}},
        Asked{"title", &BeginPack::title, TextForm{}},
        Asked{"pages", &BeginPack::pages, IntegerForm{1, MAX_PAGES}},
        Asked{"bytes", &BeginPack::bytes, IntegerForm{1, MAX_BYTES}},
        Asked{"sha256", &BeginPack::sha256, TextForm{}},
        Asked{"asks", &BeginPack::asks, FlagForm{}},
    };
};

BeginPack::BeginPack(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }

json::Object BeginPack::serialize() const {
    json::Object object = question(KIND);
    json::writeKeys(Keys::TABLE, *this, object);
    return object;
}

struct BeginPackAnswer::Keys {
    static constexpr std::tuple TABLE{
        Always{"have", &BeginPackAnswer::have},
        Always{"accepted", &BeginPackAnswer::isAccepted},
    };
};

BeginPackAnswer::BeginPackAnswer(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }

json::Object BeginPackAnswer::serialize() const { return writeRecord(*this); }

} // namespace Protocol
