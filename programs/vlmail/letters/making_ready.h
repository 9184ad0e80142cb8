#pragma once
// What the letters of a batch are made ready with: the documents that their pack presets name, taken apart
// once, and the attachments as they are printed.

#include "programs/production/maker.h"
#include "programs/vlmail/letters/document_folder.h"
#include "programs/vlmail/letters/page_blob.h"
#include "programs/vlmail/letters/worker_pool.h"
#include "vlservice/presets/presets.h"

#include <filesystem>
#include <map>
#include <memory>
#include <string>
#include <vector>

namespace VlMail {

class PresetIndex;

/// A document that was used, as a plan records it.
struct UsedDocument {
    std::string id;
    /// As FoundDocument has it.
    std::filesystem::path file;
    std::string sha256;
    bool isOfService = false;
};

/// An attachment of a pack preset with what is laid on it.
struct MadeAttachment {
    std::string id;
    /// The name of its file.
    std::string document;
    std::vector<PageBlob> pages;
};

/// Takes documents apart as Production::prepare() does, in worker processes: they may be hostile.
std::vector<Production::PreparedDocument> prepareDocuments(std::vector<FoundDocument> const& found,
                                                           Workers const& workers);

/// Used before the workers of a batch are started, which work on with what was prepared, each for itself.
class MakingReady {
public:
    enum class Colours : bool { Ignored, Counted };

    explicit MakingReady(Colours colours = Colours::Counted) : colours_(colours) {}

    /// Prepares what these pack presets name, in worker processes: the documents may be hostile. Those that
    /// cannot be used keep the letters from going out that need them.
    void prepare(std::vector<Cfg::PackPreset> const& presets, DocumentFolder const& folder,
                 Workers const& workers);

    /// The same for the pack presets by which documents of these names are sent.
    void prepareFor(std::vector<std::string> const& files, Cfg::Presets const& presets, DocumentFolder folder,
                    Workers const& workers);

    /// Why no letter of the pack preset can go out: a code and one line; empty when letters can.
    std::string whyNot(Cfg::PackPreset const& preset, std::vector<Production::PageSize> const& pages);
    /// What a person should know of the documents that its letters go out with.
    std::vector<Production::Finding> warningsFor(Cfg::PackPreset const& preset) const;
    /// A maker for its letters. It lives as long as this object.
    Production::Maker& makerFor(Cfg::PackPreset const& preset);
    bool countsColours(Cfg::PackPreset const& preset) const;
    /// In the order of the preset's list.
    std::vector<MadeAttachment> const& attachmentsOf(std::string const& packPreset) const;
    /// All documents that are named could be used.
    bool isWhole() const;
    /// Those that could be used, by their ids: all, or those that one pack preset names.
    std::vector<UsedDocument> usedDocuments() const;
    std::vector<UsedDocument> usedDocumentsOf(Cfg::PackPreset const& preset) const;

private:
    struct Attachments {
        std::string error;
        std::vector<MadeAttachment> made;
    };

    void takeDocuments(std::vector<Cfg::PackPreset> const& presets, DocumentFolder const& folder,
                       Workers const& workers);
    void makeAttachments(std::vector<Cfg::PackPreset> const& presets, Workers const& workers);

    Colours colours_;
    Production::PreparedDocuments documents_;
    /// Of those documents that were found, by id.
    std::map<std::string, UsedDocument> used_;
    /// By the pack preset's name.
    std::map<std::string, Attachments> attachments_;
    std::map<std::string, std::unique_ptr<Production::Maker>> makers_;
};

} // namespace VlMail
