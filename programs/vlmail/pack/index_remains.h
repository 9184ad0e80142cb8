#pragma once
// What is left of a container's index when the index as a whole cannot be read.

#include "programs/vlmail/pack/byte_file.h"
#include "vlservice/pack/pack_wrapper.h"

#include <optional>
#include <string>
#include <vector>

namespace VlMail {

struct IndexRemains {
    std::optional<std::string> packId;
    /// In file order; offsets as they stand in the index. Names are fit to be written again.
    std::vector<PackWrapper::BinEntry> items;
};

/// Collects the tags that are still whole, wherever they stand in the file.
IndexRemains findIndexRemains(ByteFile& file);

} // namespace VlMail
