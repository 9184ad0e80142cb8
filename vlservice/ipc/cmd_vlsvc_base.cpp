#include "vlservice/ipc/cmd_vlsvc_base.h"

#include "vlservice/ipc/cmd_processor_vlsvc.h"

#include <utility>

namespace Ipc {

CmdVLSvcBase::CmdVLSvcBase(unsigned char id, std::shared_ptr<CmdProcessorI> processor)
    : JsonCmdBase(id, std::move(processor)) {}

CmdVLSvcBase::~CmdVLSvcBase() = default;

void CmdVLSvcBase::accept(CmdProcessorI& processor) { accept(static_cast<CmdProcessorVLSvcI&>(processor)); }

} // namespace Ipc
