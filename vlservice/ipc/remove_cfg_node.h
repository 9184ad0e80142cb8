#pragma once
// Removes a configuration node.

#include "vlservice/cfg/id.h"
#include "vlservice/ipc/cmd_vlsvc_base.h"

#include <string>

namespace Ipc {

/// A received id is taken as it stands. One that is missing, or no text, reads as the root: whoever removes
/// nodes must refuse that.
class VLSERVICE_EXPORT RemoveCfgNode : public CmdVLSvcBase {
public:
    static constexpr unsigned char CMD_ID = 17;

    RemoveCfgNode(std::shared_ptr<CmdProcessorI> processor);
    RemoveCfgNode(std::shared_ptr<CmdProcessorI> processor, Cfg::Id cfgId);

    char const* name() const override;

    Cfg::Id const& cfgId() const { return cfgId_; }
    /// The error text; empty on success.
    std::string const& resp() const { return error_; }
    bool removedOK() const { return error_.empty(); }
    void setResp(std::string error);

    using CmdVLSvcBase::accept;

private:
    json::Object serializeReq() const override;
    void deserializeReq(json::Object const& request) override;
    json::Object serializeResp() const override;
    void deserializeResp(json::Object const& response) override;
    void accept(CmdProcessorVLSvcI& processor) override;

    Cfg::Id cfgId_;
    std::string error_;
};

} // namespace Ipc
