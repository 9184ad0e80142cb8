#pragma once
// Letters as files in a folder, which a print shop takes them from.

#include "programs/base/marked_folder.h"
#include "programs/carriers/carrier.h"

#include <filesystem>
#include <string>

namespace Carriers {

/// KEY.pdf, KEY.csv and last KEY.json, each there when it is whole. What is there under these names is
/// replaced.
class FolderCarrier : public Carrier {
public:
    /// `identity` is which of all folders of that name it is; the empty text is one that is not known.
    FolderCarrier(std::filesystem::path folder, std::string identity);

    Outcome handOver(Parcel const& parcel, PutOnRecord const& mayHaveIt) override;
    std::string test() override;

private:
    Base::MarkedFolder opened() const;

    std::filesystem::path folder_;
    std::string identity_;
};

/// The identity of the folder that is there, which gets a mark unless it has one. Throws std::exception when
/// it cannot.
std::string identityOfFolder(std::filesystem::path const& folder);

} // namespace Carriers
