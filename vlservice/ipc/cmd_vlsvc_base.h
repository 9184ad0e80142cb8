#pragma once
// The base of the commands between client programs and the service: it brings a command to its processor.

#include "vlservice/export.h"
#include "vlservice/platform/cmd.h"

#include <memory>

namespace Ipc {

class CmdProcessorVLSvcI;

/// Holds nothing of its own; each command adds its request and response.
class VLSERVICE_EXPORT CmdVLSvcBase : public JsonCmdBase {
protected:
    ~CmdVLSvcBase() override;

public:
    CmdVLSvcBase(unsigned char id, std::shared_ptr<CmdProcessorI> processor);
    CmdVLSvcBase(CmdVLSvcBase const&) = default;

    /// The processor must be a CmdProcessorVLSvcI; this is not tested.
    void accept(CmdProcessorI& processor) override;
    /// Calls the visit of the command's own class.
    virtual void accept(CmdProcessorVLSvcI& processor) = 0;
};

} // namespace Ipc
