#pragma once
// Asks for the tree of configuration nodes.

#include "vlservice/ipc/cmd_vlsvc_base.h"

namespace Ipc {

/// There is no payload in the request; the response is an object that passes through as it is.
class VLSERVICE_EXPORT CfgIdsTree : public CmdVLSvcBase {
public:
    static constexpr unsigned char CMD_ID = 19;

    CfgIdsTree(std::shared_ptr<CmdProcessorI> processor);

    char const* name() const override;

    json::Object const& resp() const { return payload_; }
    void setResp(json::Object resp);

    using CmdVLSvcBase::accept;

private:
    json::Object serializeResp() const override;
    void deserializeResp(json::Object const& response) override;
    void accept(CmdProcessorVLSvcI& processor) override;

    json::Object payload_;
};

} // namespace Ipc
