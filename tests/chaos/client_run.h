#pragma once
// A run of vlmail.

#include <filesystem>
#include <string>
#include <vector>

namespace Chaos {

struct ClientRun {
    /// The exit status, or minus the number of the signal that ended it.
    int status = 0;
    std::string out;
    std::string err;
};

/// Waits for its end, and ends it itself when that takes longer than vlmail is patient. What it says is kept
/// in the folder meanwhile. May be called by several threads at once.
ClientRun runClient(std::filesystem::path const& folder, std::vector<std::string> arguments);

} // namespace Chaos
