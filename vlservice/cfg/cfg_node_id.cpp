#include "vlservice/cfg/cfg_node_id.h"

#include <cstddef>
#include <string>
#include <utility>

namespace Cfg {

CfgNodeId::CfgNodeId(Id const& id) {
    for (std::string const& token : id.tokens())
        tokens_.append(token);
}

CfgNodeId::CfgNodeId(json::Value const& node) : tokens_(node.toArray()) {}

Id CfgNodeId::asCfgId() const {
    std::string text;
    for (json::Value const& token : tokens_)
        text.append(token.toString()).push_back(Id::CFG_ID_DELIM);
    if (!text.empty())
        text.pop_back();
    return Id(std::move(text), false);
}

bool CfgNodeId::isParentOf(CfgNodeId const& other) const {
    std::size_t const size = tokens_.size();
    std::size_t const otherSize = other.tokens_.size();
    if (size >= otherSize)
        return false;
    for (std::size_t i = 0; i < size; ++i) {
        if (tokens_.at(i) != other.tokens_.at(otherSize - size + i))
            return false;
    }
    return true;
}

} // namespace Cfg
