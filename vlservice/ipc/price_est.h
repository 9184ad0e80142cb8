#pragma once
// Asks what a mailing would cost.

#include "vlservice/ipc/cmd_vlsvc_base.h"

namespace Ipc {

/// The parameters go out as they are, the answer comes back as it is. One object serves both: a response
/// replaces the parameters.
class VLSERVICE_EXPORT PriceEst : public CmdVLSvcBase {
public:
    static constexpr unsigned char CMD_ID = 24;

    PriceEst(std::shared_ptr<CmdProcessorI> processor);
    PriceEst(std::shared_ptr<CmdProcessorI> processor, json::Object params);

    char const* name() const override;
    Timeouts::TimeoutId reqTimeoutId() const override;

    json::Object const& reqParams() const { return payload_; }
    json::Object const& resp() const { return payload_; }
    void setResp(json::Object resp);

    using CmdVLSvcBase::accept;

private:
    json::Object serializeReq() const override;
    void deserializeReq(json::Object const& request) override;
    json::Object serializeResp() const override;
    void deserializeResp(json::Object const& response) override;
    void accept(CmdProcessorVLSvcI& processor) override;

    json::Object payload_;
};

} // namespace Ipc
