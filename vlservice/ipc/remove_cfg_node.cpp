#include "vlservice/ipc/remove_cfg_node.h"

#include "vlservice/ipc/cmd_processor_vlsvc.h"
#include "vlservice/ipc/err_resp.h"

#include <utility>

namespace Ipc {
namespace {

constexpr char const* ID = "id";

} // namespace

RemoveCfgNode::RemoveCfgNode(std::shared_ptr<CmdProcessorI> processor)
    : CmdVLSvcBase(CMD_ID, std::move(processor)) {}

RemoveCfgNode::RemoveCfgNode(std::shared_ptr<CmdProcessorI> processor, Cfg::Id cfgId)
    : CmdVLSvcBase(CMD_ID, std::move(processor)), cfgId_(std::move(cfgId)) {}

char const* RemoveCfgNode::name() const { return "Remove Cfg Node"; }

void RemoveCfgNode::setResp(std::string error) { error_ = std::move(error); }

json::Object RemoveCfgNode::serializeReq() const { return {{ID, cfgId_.serialize()}}; }

void RemoveCfgNode::deserializeReq(json::Object const& request) { cfgId_ = Cfg::Id(request.get(ID)); }

json::Object RemoveCfgNode::serializeResp() const { return errToResp(error_); }

void RemoveCfgNode::deserializeResp(json::Object const& response) { error_ = errFromResp(response); }

void RemoveCfgNode::accept(CmdProcessorVLSvcI& processor) { processor.visit(*this); }

} // namespace Ipc
