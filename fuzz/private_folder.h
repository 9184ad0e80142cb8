#pragma once
// Where a target keeps files of its own.

#include "tests/support/temporary_folder.h"

/// Nobody else may look into it; it goes when the target ends.
inline std::filesystem::path const& privateFolder() {
    static TemporaryFolder const folder;
    return folder.path();
}
