#pragma once
// Where the documents lie that pack presets name by an id: letterheads and attachments.

#include <filesystem>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <utility>

namespace VlMail {

/// A document that was found: a file, or what a service keeps.
struct FoundDocument {
    /// An absolute path; of a service what stands for one: "service:NODE/NAME".
    std::filesystem::path file;
    /// What the service has sent; null for a file.
    std::shared_ptr<std::string const> bytes = {};

    bool isOfService() const { return bytes != nullptr; }
};

/// Documents that lie elsewhere.
struct DocumentsElsewhere {
    /// Nothing when there is none of that id. What it throws begins with a code.
    std::function<std::optional<FoundDocument>(std::string const& id)> find;
    /// The rest of "there is no document X".
    std::string place;
};

/// An id is the name of a file with its ending or without. Documents of the batch come first, then those of
/// a folder, then those elsewhere; without an ending a PDF comes before others, and those in the order of
/// their names.
class DocumentFolder {
public:
    /// Documents of the batch alone.
    DocumentFolder() = default;
    /// No folder for the empty path. Throws Error when it cannot be listed.
    explicit DocumentFolder(std::filesystem::path folder);

    /// A document of the batch; the first of a name counts.
    void add(std::filesystem::path const& file) { batch_.add(file); }
    /// The document of that id is this file, whatever else there is.
    void fix(std::string const& id, FoundDocument document) { fixed_[id] = std::move(document); }
    void orElse(DocumentsElsewhere elsewhere) { elsewhere_ = std::move(elsewhere); }

    /// Throws Error, whose line begins with a code, when there is none.
    FoundDocument find(std::string const& id) const;

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
    std::map<std::string, FoundDocument> fixed_;
    Names batch_;
    Names listed_;
    std::optional<DocumentsElsewhere> elsewhere_;
};

} // namespace VlMail
