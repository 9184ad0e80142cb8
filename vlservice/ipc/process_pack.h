#pragma once
// Tells the service to process a prepared pack.

#include "vlservice/ipc/cmd_vlsvc_base.h"

#include <string>

namespace Ipc {

/// Names the pack and the database that it lies in. There is no payload in the response.
class VLSERVICE_EXPORT ProcessPack : public CmdVLSvcBase {
public:
    static constexpr unsigned char CMD_ID = 25;

    ProcessPack(std::shared_ptr<CmdProcessorI> processor);
    ProcessPack(std::shared_ptr<CmdProcessorI> processor, std::string dbHostPort, std::string dbName,
                std::string packId);

    char const* name() const override;

    std::string const& dbHostPort() const { return dbHostPort_; } ///< or the folder of a file
    std::string const& dbName() const { return dbName_; }         ///< of the database, or of the file
    std::string const& packId() const { return packId_; }         ///< of the mailing

    using CmdVLSvcBase::accept;

private:
    json::Object serializeReq() const override;
    /// Throws json::Exc at the first key that holds no string; those before it have been taken over.
    void deserializeReq(json::Object const& request) override;
    void accept(CmdProcessorVLSvcI& processor) override;

    std::string dbHostPort_;
    std::string dbName_;
    std::string packId_;
};

} // namespace Ipc
