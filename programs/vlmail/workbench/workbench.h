#pragma once
// The workbench: presets and the letters that they read, side by side in a browser of this machine.

#include "programs/vlmail/letters/document_folder.h"
#include "programs/vlmail/letters/worker_pool.h"
#include "programs/vlmail/workbench/settings_store.h"

#include <filesystem>
#include <functional>
#include <memory>
#include <string>

namespace VlMail::Workbench {

struct Setup {
    /// With the documents.
    std::filesystem::path folder;
    /// With letterheads and attachments; empty for none.
    std::filesystem::path letterheads = {};
    /// Those of a service, as Folders has them.
    std::function<DocumentsElsewhere()> elsewhere = {};
    /// What a document may take.
    JobLimits limits = {};
};

/// Serves until the process is told to end by SIGINT or SIGTERM. `begun` is called with the address for the
/// browser as soon as it can be opened. Throws Base::Error, also when folder or settings cannot be read.
void serve(Setup const& setup, std::unique_ptr<SettingsStore> store,
           std::function<void(std::string const& url)> const& begun);

} // namespace VlMail::Workbench
