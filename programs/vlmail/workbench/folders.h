#pragma once
// Where a workbench has its documents from.

#include "programs/vlmail/letters/document_folder.h"

#include <filesystem>
#include <functional>

namespace VlMail::Workbench {

/// Where the documents lie, and those that pack presets name.
struct Folders {
    std::filesystem::path documents;
    /// Empty for none.
    std::filesystem::path letterheads = {};
    /// Gives those that a service has at the time; empty for none.
    std::function<DocumentsElsewhere()> elsewhere = {};

    /// Those that pack presets name. Throws Base::Error when the folder cannot be listed.
    DocumentFolder named() const {
        DocumentFolder folder(letterheads);
        if (elsewhere)
            folder.orElse(elsewhere());
        return folder;
    }
};

} // namespace VlMail::Workbench
