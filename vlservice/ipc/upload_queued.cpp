#include "vlservice/ipc/upload_queued.h"

#include "vlservice/ipc/cmd_processor_vlsvc.h"

#include <utility>

namespace Ipc {

UploadQueued::UploadQueued(std::shared_ptr<CmdProcessorI> processor)
    : CmdVLSvcBase(CMD_ID, std::move(processor)) {}

UploadQueued::UploadQueued(std::shared_ptr<CmdProcessorI> processor, std::string dbHost, std::string dbName)
    : CmdVLSvcBase(CMD_ID, std::move(processor)), db_{std::move(dbHost), std::move(dbName)} {}

char const* UploadQueued::name() const { return "Upload Queued"; }

json::Object UploadQueued::serializeReq() const { return db_.serialize(); }

void UploadQueued::deserializeReq(json::Object const& request) { db_.deserialize(request); }

void UploadQueued::accept(CmdProcessorVLSvcI& processor) { processor.visit(*this); }

} // namespace Ipc
