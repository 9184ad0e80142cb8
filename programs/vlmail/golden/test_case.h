#pragma once
// Test cases of presets: documents in a folder, and the files that say what is expected of them.

#include <filesystem>
#include <string>
#include <vector>

namespace VlMail {

/// A document and the file of what is expected of it. The document is empty when only that file is there; the
/// expectation may not be there yet.
struct TestCase {
    std::filesystem::path document;
    std::filesystem::path expectation;
    /// Its place in the folder.
    std::string name;

    bool hasDocument() const { return !document.empty(); }
    /// The document is a letter as the texts of its zones.
    bool isZonesText() const;
};

/// Whether a file is one that something can be expected of, by its ending.
bool isTestDocument(std::filesystem::path const& file);
/// The same of those that are letters as the texts of their zones.
bool isZonesText(std::filesystem::path const& file);
/// The file of what is expected of a document.
std::filesystem::path expectationBeside(std::filesystem::path const& document);

/// Sorted by name, those of inner folders too. Throws Error when there is no such folder or nothing in it.
std::vector<TestCase> testCasesIn(std::filesystem::path const& folder);

} // namespace VlMail
