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

    bool isRepeatable() const override { return true; }
    Outcome handOver(Parcel const& parcel) override;
    std::string test() override;

private:
    std::filesystem::path folder_;
};

} // namespace Carriers
