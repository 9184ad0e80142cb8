#include "vlservice/ipc/price_est.h"

#include "vlservice/ipc/cmd_processor_vlsvc.h"

#include <utility>

namespace Ipc {

PriceEst::PriceEst(std::shared_ptr<CmdProcessorI> processor) : CmdVLSvcBase(CMD_ID, std::move(processor)) {}

PriceEst::PriceEst(std::shared_ptr<CmdProcessorI> processor, json::Object params)
    : CmdVLSvcBase(CMD_ID, std::move(processor)), payload_(std::move(params)) {}

char const* PriceEst::name() const { return "Price Estimate"; }

Timeouts::TimeoutId PriceEst::reqTimeoutId() const { return Timeouts::TIMEOUT_ID_3; }

void PriceEst::setResp(json::Object resp) { payload_ = std::move(resp); }

json::Object PriceEst::serializeReq() const { return payload_; }
void PriceEst::deserializeReq(json::Object const& request) { payload_ = request; }
json::Object PriceEst::serializeResp() const { return payload_; }
void PriceEst::deserializeResp(json::Object const& response) { payload_ = response; }

void PriceEst::accept(CmdProcessorVLSvcI& processor) { processor.visit(*this); }

} // namespace Ipc
