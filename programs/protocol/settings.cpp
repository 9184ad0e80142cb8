#include "programs/protocol/settings.h"

#include "programs/base/error.h"
#include "programs/protocol/carrier.h"
#include "programs/protocol/query.h"
#include "programs/protocol/rows.h"

#include <utility>

namespace Protocol {
namespace {

constexpr char const* OWN = "own";
constexpr char const* WAS = "was";
constexpr char const* CARRIERS = "carriers";

json::Object objectIn(json::Object const& question, char const* key, char const* owner) {
    json::Value const values = question.get(key);
    if (!values.isObject())
        throw Base::Error(Base::Code::RequestInvalid,
                          '"' + std::string(key) + "\" of " + owner + " has to be an object");
    return values.toObject();
}

} // namespace

struct SettingsQuery::Keys {
    static constexpr std::tuple TABLE{
        Asked{"parts", &SettingsQuery::parts, TextsForm{MAX_PARTS}},
        Asked{CARRIERS, &SettingsQuery::carriers, FlagForm{}},
        Asked{"inherited", &SettingsQuery::inherited, FlagForm{}},
    };
};

struct PartSettings::Keys {
    static constexpr std::tuple TABLE{
        Always{"own", &PartSettings::own},
        Always{"values", &PartSettings::values},
        Always{"origins", &PartSettings::origins},
    };
};

struct SettingsAnswer::Keys {
    static constexpr std::tuple TABLE{
        Always{NODE_ID, &SettingsAnswer::id},
        Always{"known", &SettingsAnswer::known},
        Always{"chain", &SettingsAnswer::chain},
        Always{"parts", &SettingsAnswer::parts},
    };
};

struct SettingsImpactQuery::Keys {
    static constexpr std::tuple TABLE{
        Asked{"part", &SettingsImpactQuery::part, TextForm{}},
    };
};

struct SettingsReplacedAnswer::Keys {
    static constexpr std::tuple TABLE{
        Always{OWN, &SettingsReplacedAnswer::own},
    };
};

struct ImpactedNode::Keys {
    static constexpr std::tuple TABLE{
        Always{NODE_ID, &ImpactedNode::id},
        Always{"keys", &ImpactedNode::keys},
    };
};

struct SettingsImpactAnswer::Keys {
    static constexpr std::tuple TABLE{
        Always{"nodes", &SettingsImpactAnswer::nodes},
    };
};

struct TreeNode::Keys {
    static constexpr std::tuple TABLE{
        Always{NODE_ID, &TreeNode::id},
        Always{"descr", &TreeNode::description},
        json::Key{"disabled", &TreeNode::disabled},
        Always{"parts", &TreeNode::parts},
        Always{"children", &TreeNode::children},
    };
};

SettingsQuery::SettingsQuery(std::string nodeId, std::vector<std::string> wantedParts)
    : id(std::move(nodeId)), parts(std::move(wantedParts)) {}

SettingsQuery::SettingsQuery(json::Object const& object) : id(nodeIn(object, IN_WORDS)) {
    json::readKeys(Keys::TABLE, object, *this);
}

json::Object SettingsQuery::serialize() const {
    json::Object object = question(KIND);
    object.set(NODE_ID, id);
    json::writeKeys(Keys::TABLE, *this, object);
    return object;
}

PartSettings::PartSettings(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object PartSettings::serialize() const { return writeRecord(*this); }

SettingsAnswer::SettingsAnswer(json::Object const& object) {
    json::readKeys(Keys::TABLE, object, *this);
    if (json::Value const told = object.get(CARRIERS); told.isObject())
        carriers = told;
}

json::Object SettingsAnswer::serialize() const {
    json::Object object = writeRecord(*this);
    if (carriers)
        object.set(CARRIERS, carriers);
    return object;
}

std::optional<bool> SettingsAnswer::sendsNotices() const {
    if (!carriers)
        return std::nullopt;
    return carriers.toObject().get(NOTICE_CHANNEL).textOrEmpty() == carrierTypeName(CarrierType::Smtp);
}

PartSettings SettingsAnswer::part(std::string const& name) const {
    json::Value const found = parts.get(name);
    return found ? PartSettings(found.toObject()) : PartSettings();
}

TreeNode::TreeNode(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object TreeNode::serialize() const { return writeRecord(*this); }

SettingsImpactQuery::SettingsImpactQuery(std::string nodeId, std::string partName, json::Object values)
    : id(std::move(nodeId)), part(std::move(partName)), own(std::move(values)) {}

SettingsImpactQuery::SettingsImpactQuery(json::Object const& object) : id(nodeIn(object, IN_WORDS)) {
    json::readKeys(Keys::TABLE, object, *this);
    own = objectIn(object, OWN, IN_WORDS);
}

json::Object SettingsImpactQuery::serialize() const {
    json::Object object = question(KIND);
    object.set(NODE_ID, id);
    json::writeKeys(Keys::TABLE, *this, object);
    object.set(OWN, own);
    return object;
}

SettingsReplacement::SettingsReplacement(std::string nodeId, json::Object valuesBefore, json::Object values)
    : id(std::move(nodeId)), was(std::move(valuesBefore)), own(std::move(values)) {}

SettingsReplacement::SettingsReplacement(json::Object const& object)
    : id(nodeIn(object, IN_WORDS)), was(objectIn(object, WAS, IN_WORDS)),
      own(objectIn(object, OWN, IN_WORDS)) {}

json::Object SettingsReplacement::serialize() const {
    json::Object object = question(KIND);
    object.set(NODE_ID, id);
    object.set(WAS, was);
    object.set(OWN, own);
    return object;
}

SettingsReplacedAnswer::SettingsReplacedAnswer(json::Object const& object) {
    json::readKeys(Keys::TABLE, object, *this);
}
json::Object SettingsReplacedAnswer::serialize() const { return writeRecord(*this); }

ImpactedNode::ImpactedNode(std::string nodeId, std::vector<std::string> changedKeys)
    : id(std::move(nodeId)), keys(std::move(changedKeys)) {}
ImpactedNode::ImpactedNode(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object ImpactedNode::serialize() const { return writeRecord(*this); }

SettingsImpactAnswer::SettingsImpactAnswer(json::Object const& object) {
    json::readKeys(Keys::TABLE, object, *this);
}
json::Object SettingsImpactAnswer::serialize() const { return writeRecord(*this); }

} // namespace Protocol
