#pragma once
// Tells the service to bring the states of its jobs up to date.

#include "vlservice/ipc/cmd_vlsvc_base.h"
#include "vlservice/ipc/pack_db.h"

#include <string>

namespace Ipc {

/// Names the database of the packs. There is no payload in the response.
class VLSERVICE_EXPORT UpdateStatus : public CmdVLSvcBase {
public:
    static constexpr unsigned char CMD_ID = 21;

    UpdateStatus(std::shared_ptr<CmdProcessorI> processor);
    UpdateStatus(std::shared_ptr<CmdProcessorI> processor, std::string dbHost, std::string dbName);

    char const* name() const override;
    Timeouts::TimeoutId reqTimeoutId() const override;

    std::string const& dbHost() const { return db_.host; } ///< or the folder of a file
    std::string const& dbName() const { return db_.name; } ///< of the database, or of the file

    using CmdVLSvcBase::accept;

private:
    json::Object serializeReq() const override;
    void deserializeReq(json::Object const& request) override;
    void accept(CmdProcessorVLSvcI& processor) override;

    PackDb db_;
};

} // namespace Ipc
