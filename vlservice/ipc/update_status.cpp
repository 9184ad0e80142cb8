#include "vlservice/ipc/update_status.h"

#include "vlservice/ipc/cmd_processor_vlsvc.h"

#include <utility>

namespace Ipc {

UpdateStatus::UpdateStatus(std::shared_ptr<CmdProcessorI> processor)
    : CmdVLSvcBase(CMD_ID, std::move(processor)) {}

UpdateStatus::UpdateStatus(std::shared_ptr<CmdProcessorI> processor, std::string dbHost, std::string dbName)
    : CmdVLSvcBase(CMD_ID, std::move(processor)), db_{std::move(dbHost), std::move(dbName)} {}

char const* UpdateStatus::name() const { return "Update Status"; }

Timeouts::TimeoutId UpdateStatus::reqTimeoutId() const { return Timeouts::TIMEOUT_ID_3; }

json::Object UpdateStatus::serializeReq() const { return db_.serialize(); }

void UpdateStatus::deserializeReq(json::Object const& request) { db_.deserialize(request); }

void UpdateStatus::accept(CmdProcessorVLSvcI& processor) { processor.visit(*this); }

} // namespace Ipc
