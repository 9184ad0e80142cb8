#pragma once
// The name of a configuration node as a JSON array of its tokens, for documents.

#include "vlservice/cfg/id.h"
#include "vlservice/export.h"
#include "vlservice/json/json.h"

namespace Cfg {

/// The tokens of an Id in the same order; the empty array is the root.
class VLSERVICE_EXPORT CfgNodeId {
public:
    /// The key of a node id in documents.
    static constexpr char const* NODE_ID_FLD_NAME = "id";

    CfgNodeId() = default;
    CfgNodeId(Id const& id); ///< by the text of an id
    /// Shares the array. Throws json::Exc when the node is none.
    CfgNodeId(json::Value const& node);

    /// The same array, shared.
    json::Value serialize() const { return tokens_; }
    /// The tokens joined by slashes and taken as they are. Throws json::Exc when one is no string.
    Id asCfgId() const;
    friend bool operator==(CfgNodeId const& a, CfgNodeId const& b) { return a.tokens_ == b.tokens_; }

    /// Whether this node is an ancestor of the other, at any distance. No node is its own.
    bool isParentOf(CfgNodeId const& other) const;

private:
    json::Array tokens_;
};

} // namespace Cfg
