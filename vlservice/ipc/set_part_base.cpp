#include "vlservice/ipc/set_part_base.h"

#include "vlservice/ipc/cmd_processor_vlsvc.h"
#include "vlservice/ipc/err_resp.h"

#include <utility>

namespace Ipc {
namespace {

constexpr char const* CFG_ID = "cfg_id";
constexpr char const* PART = "part";

} // namespace

SetPartBase::SetPartBase(unsigned char id, std::shared_ptr<CmdProcessorI> processor)
    : CmdVLSvcBase(id, std::move(processor)) {}

SetPartBase::SetPartBase(unsigned char id, std::shared_ptr<CmdProcessorI> processor, Cfg::Id cfgId,
                         json::Value partJson)
    : CmdVLSvcBase(id, std::move(processor)), cfgId_(std::move(cfgId)), partJson_(std::move(partJson)) {}

SetPartBase::~SetPartBase() = default;

void SetPartBase::setResp(std::string error) { error_ = std::move(error); }

json::Object SetPartBase::serializeReq() const {
    json::Object request{{CFG_ID, cfgId_.serialize()}};
    if (partJson_)
        request.set(PART, partJson_);
    return request;
}

void SetPartBase::deserializeReq(json::Object const& request) {
    // A node that is changed is never the root by mistake, so here the id must be there.
    json::Value const id = request.get(CFG_ID);
    id.toString();
    json::Value part = request.get(PART);
    requireReadable(part);
    cfgId_ = Cfg::Id(id);
    partJson_ = std::move(part);
}

json::Object SetPartBase::serializeResp() const { return errToResp(error_); }

void SetPartBase::deserializeResp(json::Object const& response) { error_ = errFromResp(response); }

void SetPartBase::accept(CmdProcessorVLSvcI& processor) {
    if (auto* const setter = dynamic_cast<SetPartProcessorI*>(&processor))
        setter->visit(*this);
    else
        setResp("The part \"" + partName() + "\" cannot be set here.");
}

SetPartProcessorI::~SetPartProcessorI() = default;

} // namespace Ipc
