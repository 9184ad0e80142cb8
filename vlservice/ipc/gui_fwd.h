#pragma once
// An object on its way to the graphical client, inside one program.

#include "vlservice/ipc/cmd_vlsvc_base.h"

namespace Ipc {

/// A local carrier: its object deliberately never travels over a connection.
class VLSERVICE_EXPORT GuiFwd : public CmdVLSvcBase {
public:
    static constexpr unsigned char CMD_ID = 28;

    GuiFwd(std::shared_ptr<CmdProcessorI> processor);
    GuiFwd(std::shared_ptr<CmdProcessorI> processor, json::Object params);

    char const* name() const override;
    json::Object const& params() const { return params_; }

    using CmdVLSvcBase::accept;

private:
    void accept(CmdProcessorVLSvcI& processor) override;

    json::Object params_;
};

} // namespace Ipc
