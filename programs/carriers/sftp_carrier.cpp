#include "programs/carriers/sftp_carrier.h"

#include "programs/base/secret_file.h"
#include "programs/carriers/control_file.h"

#include <utility>

namespace Carriers {
namespace {

constexpr unsigned long long MIB = 1 << 20;

} // namespace

SftpCarrier::SftpCarrier(Protocol::CarrierSettings settings, StopSign stop)
    : settings_(std::move(settings)), stop_(std::move(stop)) {}

SftpSession& SftpCarrier::session() {
    if (!session_)
        session_ = std::make_unique<SftpSession>(
            SftpTarget{settings_.url, settings_.hostKey, Base::secretFile(settings_.identityFile)}, stop_);
    return *session_;
}

Outcome SftpCarrier::handOver(Parcel const& parcel, PutOnRecord const& /*mayHaveIt*/) {
    // The control file of an earlier attempt goes before what it tells of does.
    std::string goesFirst = parcel.key + ".json";
    forEachFile(parcel, [&](std::string const& name, std::string_view bytes, bool /*isLast*/) {
        session().put(name, bytes, std::exchange(goesFirst, {}));
    });
    return {Outcome::Kind::Accepted, "in " + settings_.url};
}

std::string SftpCarrier::test() {
    std::optional<unsigned long long> const room = session().tryOut();
    return settings_.url + " can be written into" +
           (room ? " and has room for " + std::to_string(*room / MIB) + " MiB" : std::string());
}

} // namespace Carriers
