#pragma once
// Whether a mailing file is whole: every blob, the index, and what the metadata says of it.

#include "programs/vlmail/pack/container_file.h"

#include <cstddef>
#include <string>
#include <vector>

namespace VlMail {

struct ContainerCheck {
    std::size_t pages = 0;
    std::size_t documents = 0;
    /// Each as "page 2 of "a.pdf": its checksum is wrong".
    std::vector<std::string> damages;
};

/// Reads all of the file once.
ContainerCheck checkContainer(ContainerFile& container);

} // namespace VlMail
