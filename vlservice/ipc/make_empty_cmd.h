#pragma once
// From a command's number to an empty command, for the side that receives it.

#include "vlservice/export.h"
#include "vlservice/ipc/cmd_vlsvc_base.h"

#include <memory>

namespace Ipc {

/// Null when no command has that number. GuiFwd, which never travels, counts as none.
VLSERVICE_EXPORT std::shared_ptr<CmdVLSvcBase> makeEmptyCmd(unsigned char id,
                                                            std::shared_ptr<CmdProcessorI> processor);

} // namespace Ipc
