#pragma once
// The documents of a workbench's folder.

#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

namespace VlMail::Workbench {

struct ListedDocument {
    /// Its place in the folder.
    std::string name;
    std::uint64_t size = 0;
    /// Another one when the file has changed.
    std::string version = {};
    /// Something is expected of it: a file NAME.expected.json lies beside it.
    bool isGolden = false;
};

struct DocumentList {
    /// By name.
    std::vector<ListedDocument> documents;
    /// What could not be looked into, a line each.
    std::vector<std::string> problems;
};

/// Files of documents and of letters as the texts of their zones, those of inner folders too; names that are
/// no UTF-8 are problems. Reads none of them.
DocumentList documentsIn(std::filesystem::path const& folder);

/// Whether a name is one that the list of this folder may have; others lead out of it.
bool isNameInside(std::filesystem::path const& folder, std::string const& name);

} // namespace VlMail::Workbench
