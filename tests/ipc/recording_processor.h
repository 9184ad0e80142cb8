#pragma once
// A processor that notes which of its operations were reached.

#include "vlservice/ipc/cmd_processor_vlsvc.h"
#include "vlservice/ipc/set_part_base.h"

#include <memory>
#include <string>
#include <vector>

/// Handles the fixed list of commands, and no parts.
class RecordingProcessor : public Ipc::CmdProcessorVLSvcI {
public:
    std::vector<std::string> visited;
    std::vector<std::shared_ptr<Ipc::CmdI>> submitted;

    void submit(std::shared_ptr<Ipc::CmdI> cmd) override { submitted.push_back(std::move(cmd)); }

    void visit(Ipc::CSConfigSrvChange&) override { visited.push_back("CSConfigSrvChange"); }
    void visit(Ipc::CSConfigIdsList&) override { visited.push_back("CSConfigIdsList"); }
    void visit(Ipc::GuiFwd&) override { visited.push_back("GuiFwd"); }
    void visit(Ipc::SetSvcCfg&) override { visited.push_back("SetSvcCfg"); }
    void visit(Ipc::GetSvcCfg&) override { visited.push_back("GetSvcCfg"); }
    void visit(Ipc::ProcessPack&) override { visited.push_back("ProcessPack"); }
    void visit(Ipc::PriceEst&) override { visited.push_back("PriceEst"); }
    void visit(Ipc::UpdateCfg&) override { visited.push_back("UpdateCfg"); }
    void visit(Ipc::UpdateStatus&) override { visited.push_back("UpdateStatus"); }
    void visit(Ipc::UploadQueued&) override { visited.push_back("UploadQueued"); }
    void visit(Ipc::CfgIdsTree&) override { visited.push_back("CfgIdsTree"); }
    void visit(Ipc::CfgIdsForUser&) override { visited.push_back("CfgIdsForUser"); }
    void visit(Ipc::RemoveCfgNode&) override { visited.push_back("RemoveCfgNode"); }
};

/// Handles parts too.
class PartSettingProcessor : public RecordingProcessor, public Ipc::SetPartProcessorI {
public:
    using RecordingProcessor::visit;
    void visit(Ipc::SetPartBase& cmd) override { visited.push_back("set " + cmd.partName()); }
};
