#pragma once
// Letters as files in a folder of another machine, which a print shop takes them from.

#include "programs/carriers/carrier.h"
#include "programs/carriers/sftp_session.h"

#include <memory>

namespace Carriers {

/// The same files as those of FolderCarrier, each there when it is whole.
class SftpCarrier : public Carrier {
public:
    explicit SftpCarrier(Protocol::CarrierSettings settings, StopSign stop = {});

    Outcome handOver(Parcel const& parcel, PutOnRecord const& mayHaveIt) override;
    std::string test() override;

private:
    /// Made when it is first wanted: where the private key lies may change while nothing is sent.
    SftpSession& session();

    Protocol::CarrierSettings settings_;
    StopSign stop_;
    std::unique_ptr<SftpSession> session_;
};

} // namespace Carriers
