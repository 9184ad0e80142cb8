#include "vlservice/ipc/gui_fwd.h"

#include "vlservice/ipc/cmd_processor_vlsvc.h"

#include <utility>

namespace Ipc {

GuiFwd::GuiFwd(std::shared_ptr<CmdProcessorI> processor) : CmdVLSvcBase(CMD_ID, std::move(processor)) {}

GuiFwd::GuiFwd(std::shared_ptr<CmdProcessorI> processor, json::Object params)
    : CmdVLSvcBase(CMD_ID, std::move(processor)), params_(std::move(params)) {}

char const* GuiFwd::name() const { return "GUI Forward"; }

void GuiFwd::accept(CmdProcessorVLSvcI& processor) { processor.visit(*this); }

} // namespace Ipc
