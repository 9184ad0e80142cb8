#pragma once
// A program that is run to its end with a call that fails.

#include "tests/faults/fault.h"

#include <filesystem>

namespace Faults {

struct Ended {
    /// The exit status, or minus the number of the signal that ended it.
    int status = 0;
    std::string out;
    std::string err;
    /// How many calls of the fault's kind there were, up to the end.
    long calls = 0;
    bool isLate = false;
};

/// Runs it in the folder. What it writes and its count stand in files beside the folder meanwhile. After two
/// minutes it is late and killed.
Ended runWith(Fault const& fault, std::filesystem::path const& program, std::vector<std::string> arguments,
              std::filesystem::path const& folder);

} // namespace Faults
