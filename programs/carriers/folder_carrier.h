#pragma once
// Letters as files in a folder, which a print shop takes them from.

#include "programs/carriers/carrier.h"

#include <filesystem>

namespace Carriers {

/// KEY.pdf, KEY.csv and last KEY.json, each there when it is whole. What is there under these names is
/// replaced.
class FolderCarrier : public Carrier {
public:
    explicit FolderCarrier(std::filesystem::path folder);

    Outcome handOver(Parcel const& parcel, PutOnRecord const& mayHaveIt) override;
    std::string test() override;

private:
    std::filesystem::path folder_;
};

} // namespace Carriers
