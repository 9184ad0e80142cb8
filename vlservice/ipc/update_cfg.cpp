#include "vlservice/ipc/update_cfg.h"

#include "vlservice/ipc/cmd_processor_vlsvc.h"
#include "vlservice/ipc/err_resp.h"

#include <utility>

namespace Ipc {
namespace {

constexpr char const* CFG_ID = "cfg_id";
constexpr char const* RESET_CFG = "reset_cfg";

} // namespace

UpdateCfg::UpdateCfg(std::shared_ptr<CmdProcessorI> processor) : CmdVLSvcBase(CMD_ID, std::move(processor)) {}

UpdateCfg::UpdateCfg(std::shared_ptr<CmdProcessorI> processor, Cfg::Id cfgId, bool resetCfg)
    : CmdVLSvcBase(CMD_ID, std::move(processor)), cfgId_(std::move(cfgId)), resetCfg_(resetCfg) {}

char const* UpdateCfg::name() const { return "Update Cfg"; }

Timeouts::TimeoutId UpdateCfg::reqTimeoutId() const { return Timeouts::TIMEOUT_ID_3; }

void UpdateCfg::setResp(std::string error) { error_ = std::move(error); }

json::Object UpdateCfg::serializeReq() const {
    json::Object request{{CFG_ID, cfgId_.serialize()}};
    if (resetCfg_)
        request.set(RESET_CFG, true);
    return request;
}

void UpdateCfg::deserializeReq(json::Object const& request) {
    cfgId_ = Cfg::Id(request.get(CFG_ID));
    resetCfg_ = request.get(RESET_CFG).isTrue();
}

json::Object UpdateCfg::serializeResp() const { return errToResp(error_); }

void UpdateCfg::deserializeResp(json::Object const& response) { error_ = errFromResp(response); }

void UpdateCfg::accept(CmdProcessorVLSvcI& processor) { processor.visit(*this); }

} // namespace Ipc
