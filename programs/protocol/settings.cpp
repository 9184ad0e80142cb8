#include "programs/protocol/settings.h"

#include "programs/protocol/query.h"
#include "programs/protocol/rows.h"

#include <utility>

namespace Protocol {
struct SettingsQuery::Keys {
    static constexpr std::tuple TABLE{
        Asked{"parts", &SettingsQuery::parts, TextsForm{MAX_PARTS}},
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

SettingsAnswer::SettingsAnswer(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object SettingsAnswer::serialize() const { return writeRecord(*this); }

PartSettings SettingsAnswer::part(std::string const& name) const {
    json::Value const found = parts.get(name);
    return found ? PartSettings(found.toObject()) : PartSettings();
}

TreeNode::TreeNode(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object TreeNode::serialize() const { return writeRecord(*this); }

} // namespace Protocol
