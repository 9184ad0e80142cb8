#pragma once
// Asks which configuration ids a user may use.

#include "vlservice/ipc/cmd_vlsvc_base.h"

#include <string>
#include <vector>

namespace Ipc {

/// With a user: his node and all above it. Without one: all nodes that are no user's.
class VLSERVICE_EXPORT CfgIdsForUser : public CmdVLSvcBase {
public:
    static constexpr unsigned char CMD_ID = 18;

    /// A node of the answer.
    struct IdData {
        std::string id;          ///< of the node
        std::string description; ///< what people call it
        bool disabled = false;   ///< nobody may send for it
    };

    CfgIdsForUser(std::shared_ptr<CmdProcessorI> processor);
    CfgIdsForUser(std::shared_ptr<CmdProcessorI> processor, std::string user);

    char const* name() const override;

    /// The user whose own node is to be in the answer; empty for none.
    std::string const& inclUser() const { return user_; }
    std::vector<IdData> const& resp() const { return ids_; }
    void addToResp(IdData idData); ///< behind those that it has

    using CmdVLSvcBase::accept;

private:
    json::Object serializeReq() const override;
    void deserializeReq(json::Object const& request) override;
    json::Object serializeResp() const override;
    /// Replaces the list as a whole. Throws json::Exc, and keeps the former list, when the ids are no array,
    /// an element is no object or has no description.
    void deserializeResp(json::Object const& response) override;
    void accept(CmdProcessorVLSvcI& processor) override;

    std::string user_;
    std::vector<IdData> ids_;
};

} // namespace Ipc
