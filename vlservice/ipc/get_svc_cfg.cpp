#include "vlservice/ipc/get_svc_cfg.h"

#include "vlservice/ipc/cmd_processor_vlsvc.h"

#include <utility>

namespace Ipc {

GetSvcCfg::GetSvcCfg(std::shared_ptr<CmdProcessorI> processor) : CmdVLSvcBase(CMD_ID, std::move(processor)) {}

char const* GetSvcCfg::name() const { return "Get Service Cfg"; }

void GetSvcCfg::setResp(json::Object resp) { payload_ = std::move(resp); }

json::Object GetSvcCfg::serializeResp() const { return payload_; }

void GetSvcCfg::deserializeResp(json::Object const& response) { payload_ = response; }

void GetSvcCfg::accept(CmdProcessorVLSvcI& processor) { processor.visit(*this); }

} // namespace Ipc
