#pragma once
// The workbench: presets and the letters that they read, side by side in a browser of this machine.

#include <filesystem>
#include <functional>
#include <string>

namespace VlMail::Workbench {

struct Setup {
    /// With the documents.
    std::filesystem::path folder;
};

/// Serves until the process is told to end by SIGINT or SIGTERM. `begun` is called with the address for the
/// browser as soon as it can be opened. Throws Error.
void serve(Setup const& setup, std::function<void(std::string const& url)> const& begun);

} // namespace VlMail::Workbench
