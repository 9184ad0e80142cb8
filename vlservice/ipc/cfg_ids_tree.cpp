#include "vlservice/ipc/cfg_ids_tree.h"

#include "vlservice/ipc/cmd_processor_vlsvc.h"

#include <utility>

namespace Ipc {

CfgIdsTree::CfgIdsTree(std::shared_ptr<CmdProcessorI> processor)
    : CmdVLSvcBase(CMD_ID, std::move(processor)) {}

char const* CfgIdsTree::name() const { return "Config Tree"; }

void CfgIdsTree::setResp(json::Object resp) { payload_ = std::move(resp); }

json::Object CfgIdsTree::serializeResp() const { return payload_; }

void CfgIdsTree::deserializeResp(json::Object const& response) { payload_ = response; }

void CfgIdsTree::accept(CmdProcessorVLSvcI& processor) { processor.visit(*this); }

} // namespace Ipc
