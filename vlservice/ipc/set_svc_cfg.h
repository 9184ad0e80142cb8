#pragma once
// Changes the service's own settings.

#include "vlservice/ipc/cmd_vlsvc_base.h"

namespace Ipc {

/// The request is an object that passes through as it is; there is no payload in the response.
class VLSERVICE_EXPORT SetSvcCfg : public CmdVLSvcBase {
public:
    static constexpr unsigned char CMD_ID = 27;

    SetSvcCfg(std::shared_ptr<CmdProcessorI> processor);
    SetSvcCfg(std::shared_ptr<CmdProcessorI> processor, json::Object settings);

    char const* name() const override;
    json::Object const& req() const { return payload_; }

    using CmdVLSvcBase::accept;

private:
    json::Object serializeReq() const override;
    void deserializeReq(json::Object const& request) override;
    void accept(CmdProcessorVLSvcI& processor) override;

    json::Object payload_;
};

} // namespace Ipc
