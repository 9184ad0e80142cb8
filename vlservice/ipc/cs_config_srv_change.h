#pragma once
// Tells of a change of the central service's configuration and whether work is suspended by it.

#include "vlservice/ipc/cmd_vlsvc_base.h"

#include <cstdint>

namespace Ipc {

/// There is no payload in the response.
class VLSERVICE_EXPORT CSConfigSrvChange : public CmdVLSvcBase {
public:
    static constexpr unsigned char CMD_ID = 30;

    /// Numbers without a name are carried as they are.
    enum class SuspendType : std::int32_t { None = 0 };

    CSConfigSrvChange(std::shared_ptr<CmdProcessorI> processor);
    CSConfigSrvChange(std::shared_ptr<CmdProcessorI> processor, SuspendType suspend);

    char const* name() const override;
    Timeouts::TimeoutId reqTimeoutId() const override;

    SuspendType suspend() const { return suspend_; } ///< what is held back

    using CmdVLSvcBase::accept;

private:
    json::Object serializeReq() const override;
    void deserializeReq(json::Object const& request) override;
    void accept(CmdProcessorVLSvcI& processor) override;

    SuspendType suspend_ = SuspendType::None;
};

} // namespace Ipc
