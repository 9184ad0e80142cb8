#include "vlservice/ipc/set_svc_cfg.h"

#include "vlservice/ipc/cmd_processor_vlsvc.h"

#include <utility>

namespace Ipc {

SetSvcCfg::SetSvcCfg(std::shared_ptr<CmdProcessorI> processor) : CmdVLSvcBase(CMD_ID, std::move(processor)) {}

SetSvcCfg::SetSvcCfg(std::shared_ptr<CmdProcessorI> processor, json::Object settings)
    : CmdVLSvcBase(CMD_ID, std::move(processor)), payload_(std::move(settings)) {}

char const* SetSvcCfg::name() const { return "Set Service Cfg"; }

json::Object SetSvcCfg::serializeReq() const { return payload_; }

void SetSvcCfg::deserializeReq(json::Object const& request) { payload_ = request; }

void SetSvcCfg::accept(CmdProcessorVLSvcI& processor) { processor.visit(*this); }

} // namespace Ipc
