#include "vlservice/ipc/cs_config_srv_change.h"

#include "vlservice/ipc/cmd_processor_vlsvc.h"

#include <utility>

namespace Ipc {
namespace {

constexpr char const* SUSPEND_TYPE = "susp_type";

} // namespace

CSConfigSrvChange::CSConfigSrvChange(std::shared_ptr<CmdProcessorI> processor)
    : CmdVLSvcBase(CMD_ID, std::move(processor)) {}

CSConfigSrvChange::CSConfigSrvChange(std::shared_ptr<CmdProcessorI> processor, SuspendType suspend)
    : CmdVLSvcBase(CMD_ID, std::move(processor)), suspend_(suspend) {}

char const* CSConfigSrvChange::name() const { return "CSConfig Srv Change"; }

Timeouts::TimeoutId CSConfigSrvChange::reqTimeoutId() const { return Timeouts::TIMEOUT_ID_3; }

json::Object CSConfigSrvChange::serializeReq() const {
    json::Object request;
    if (suspend_ != SuspendType::None)
        request.set(SUSPEND_TYPE, static_cast<std::int32_t>(suspend_));
    return request;
}

void CSConfigSrvChange::deserializeReq(json::Object const& request) {
    suspend_ = static_cast<SuspendType>(static_cast<std::int32_t>(request.get(SUSPEND_TYPE).intOrZero()));
}

void CSConfigSrvChange::accept(CmdProcessorVLSvcI& processor) { processor.visit(*this); }

} // namespace Ipc
