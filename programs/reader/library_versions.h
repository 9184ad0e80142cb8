#pragma once

#include "programs/base/version.h"

#include <vector>

namespace Reader {

/// Of those that documents are read and written with.
std::vector<Base::LibraryVersion> libraryVersions();

} // namespace Reader
