#include "vlservice/ipc/process_pack.h"

#include "vlservice/ipc/cmd_processor_vlsvc.h"

#include <utility>

namespace Ipc {
namespace {

constexpr char const* DB_CONN = "db_conn";
constexpr char const* DB_NAME = "db_name";
constexpr char const* PACK_ID = "id";

} // namespace

ProcessPack::ProcessPack(std::shared_ptr<CmdProcessorI> processor)
    : CmdVLSvcBase(CMD_ID, std::move(processor)) {}

ProcessPack::ProcessPack(std::shared_ptr<CmdProcessorI> processor, std::string dbHostPort, std::string dbName,
                         std::string packId)
    : CmdVLSvcBase(CMD_ID, std::move(processor)), dbHostPort_(std::move(dbHostPort)),
      dbName_(std::move(dbName)), packId_(std::move(packId)) {}

char const* ProcessPack::name() const { return "Process Pack"; }

json::Object ProcessPack::serializeReq() const {
    return {{DB_CONN, dbHostPort_}, {DB_NAME, dbName_}, {PACK_ID, packId_}};
}

void ProcessPack::deserializeReq(json::Object const& request) {
    dbHostPort_ = request.get(DB_CONN).toString();
    dbName_ = request.get(DB_NAME).toString();
    packId_ = request.get(PACK_ID).toString();
}

void ProcessPack::accept(CmdProcessorVLSvcI& processor) { processor.visit(*this); }

} // namespace Ipc
