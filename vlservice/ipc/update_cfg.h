#pragma once
// Makes the service bring the configuration of a node up to date.

#include "vlservice/cfg/id.h"
#include "vlservice/ipc/cmd_vlsvc_base.h"

#include <string>

namespace Ipc {

/// With `resetCfg` what the service holds of the node is thrown away first. A received id is taken as it
/// stands; one that is missing, or no text, reads as the root.
class VLSERVICE_EXPORT UpdateCfg : public CmdVLSvcBase {
public:
    static constexpr unsigned char CMD_ID = 22;

    UpdateCfg(std::shared_ptr<CmdProcessorI> processor);
    UpdateCfg(std::shared_ptr<CmdProcessorI> processor, Cfg::Id cfgId, bool resetCfg);

    char const* name() const override;
    Timeouts::TimeoutId reqTimeoutId() const override;

    Cfg::Id const& cfgId() const { return cfgId_; }
    bool resetCfg() const { return resetCfg_; } ///< what it holds goes first
    bool respOK() const { return error_.empty(); }
    /// Empty on success.
    std::string const& respErrMsg() const { return error_; }
    void setResp(std::string error);

    using CmdVLSvcBase::accept;

private:
    json::Object serializeReq() const override;
    void deserializeReq(json::Object const& request) override;
    json::Object serializeResp() const override;
    void deserializeResp(json::Object const& response) override;
    void accept(CmdProcessorVLSvcI& processor) override;

    Cfg::Id cfgId_;
    bool resetCfg_ = false;
    std::string error_;
};

} // namespace Ipc
