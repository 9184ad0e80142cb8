#include "vlservice/ipc/cs_config_ids_list.h"

#include "vlservice/ipc/cmd_processor_vlsvc.h"

#include <utility>

namespace Ipc {

CSConfigIdsList::CSConfigIdsList(std::shared_ptr<CmdProcessorI> processor)
    : CmdVLSvcBase(CMD_ID, std::move(processor)) {}

CSConfigIdsList::CSConfigIdsList(std::shared_ptr<CmdProcessorI> processor, json::Object params)
    : CmdVLSvcBase(CMD_ID, std::move(processor)), payload_(std::move(params)) {}

char const* CSConfigIdsList::name() const { return "CSConfig Ids List"; }

Timeouts::TimeoutId CSConfigIdsList::reqTimeoutId() const { return Timeouts::TIMEOUT_ID_3; }

void CSConfigIdsList::setResp(json::Object resp) { payload_ = std::move(resp); }

json::Object CSConfigIdsList::serializeReq() const { return payload_; }
void CSConfigIdsList::deserializeReq(json::Object const& request) { payload_ = request; }
json::Object CSConfigIdsList::serializeResp() const { return payload_; }
void CSConfigIdsList::deserializeResp(json::Object const& response) { payload_ = response; }

void CSConfigIdsList::accept(CmdProcessorVLSvcI& processor) { processor.visit(*this); }

} // namespace Ipc
