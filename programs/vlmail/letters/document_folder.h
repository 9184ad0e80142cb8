#pragma once
// Where the documents lie that pack presets name by an id: letterheads and attachments.

#include <filesystem>
#include <map>
#include <string>

namespace VlMail {

/// An id is the name of a file with its ending or without. Documents of the batch come first, then those of
/// a folder; without an ending a PDF comes before others, and those in the order of their names.
class DocumentFolder {
public:
    /// Documents of the batch alone.
    DocumentFolder() = default;
    /// No folder for the empty path. Throws Error when it cannot be listed.
    explicit DocumentFolder(std::filesystem::path folder);

    /// A document of the batch; the first of a name counts.
    void add(std::filesystem::path const& file) { batch_.add(file); }
    /// The document of that id is this file, whatever else there is.
    void fix(std::string const& id, std::filesystem::path const& file) { fixed_[id] = file; }

    /// The file of a document. Throws Error, whose line begins with a code, when there is none.
    std::filesystem::path find(std::string const& id) const;

private:
    /// Files by their names, of which the first counts.
    class Names {
    public:
        void add(std::filesystem::path const& file);
        /// Nullptr when there is none.
        std::filesystem::path const* find(std::string const& id) const;

    private:
        std::map<std::string, std::filesystem::path> whole_;
        std::map<std::string, std::filesystem::path> withoutEnding_;
    };

    void requireInside(std::string const& id, std::filesystem::path const& file) const;
    std::string places() const;

    std::filesystem::path folder_;
    std::map<std::string, std::filesystem::path> fixed_;
    Names batch_;
    Names listed_;
};

} // namespace VlMail
