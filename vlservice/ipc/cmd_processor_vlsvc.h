#pragma once
// What handles the commands of the service: one operation for each.

#include "vlservice/export.h"
#include "vlservice/platform/cmd.h"

namespace Ipc {

class CfgIdsForUser;
class CfgIdsTree;
class CSConfigIdsList;
class CSConfigSrvChange;
class GetSvcCfg;
class GuiFwd;
class PriceEst;
class ProcessPack;
class RemoveCfgNode;
class SetSvcCfg;
class UpdateCfg;
class UpdateStatus;
class UploadQueued;

/// The order of the operations is part of the binary interface: it is the reverse of the commands' numbers.
/// Commands that set a settings part come by SetPartProcessorI.
class VLSERVICE_EXPORT CmdProcessorVLSvcI : public CmdProcessorI {
public:
    virtual void visit(CSConfigSrvChange& cmd) = 0;
    virtual void visit(CSConfigIdsList& cmd) = 0;
    virtual void visit(GuiFwd& cmd) = 0;
    virtual void visit(SetSvcCfg& cmd) = 0;
    virtual void visit(GetSvcCfg& cmd) = 0;
    virtual void visit(ProcessPack& cmd) = 0;
    virtual void visit(PriceEst& cmd) = 0;
    virtual void visit(UpdateCfg& cmd) = 0;
    virtual void visit(UpdateStatus& cmd) = 0;
    virtual void visit(UploadQueued& cmd) = 0;
    virtual void visit(CfgIdsTree& cmd) = 0;
    virtual void visit(CfgIdsForUser& cmd) = 0;
    virtual void visit(RemoveCfgNode& cmd) = 0;
};

} // namespace Ipc
