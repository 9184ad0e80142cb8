#include "programs/carriers/folder_carrier.h"

#include "programs/base/pending_file.h"
#include "programs/carriers/control_file.h"

#include <utility>

namespace Carriers {

FolderCarrier::FolderCarrier(std::filesystem::path folder) : folder_(std::move(folder)) {}

Outcome FolderCarrier::handOver(Parcel const& parcel) {
    std::string const document = parcel.key + ".pdf";
    Base::writeFile(folder_ / document, parcel.document);
    Base::writeFile(folder_ / (parcel.key + ".csv"), controlCsv(parcel, document));
    // Whoever finds this one finds the others whole.
    Base::writeFile(folder_ / (parcel.key + ".json"), controlJson(parcel, document));
    return {Outcome::Kind::Accepted, "in " + folder_.string()};
}

std::string FolderCarrier::test() {
    Base::PendingFile const writable(folder_ / "test");
    constexpr std::uintmax_t MIB = 1 << 20;
    return folder_.string() + " can be written into and has room for " +
           std::to_string(std::filesystem::space(folder_).available / MIB) + " MiB";
}

} // namespace Carriers
