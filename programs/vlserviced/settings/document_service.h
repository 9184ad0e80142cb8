#pragma once
// What the service does with the documents of nodes: letterheads and attachments that pack presets name.

#include "programs/base/digest.h"
#include "programs/policy/rights.h"
#include "programs/protocol/documents.h"
#include "programs/vlserviced/settings/settings_service.h"
#include "programs/vlserviced/store/document_store.h"

#include <functional>
#include <map>
#include <string>

namespace VlServiced {

/// Every operation throws Error, one line, for what cannot be; each that changes something, while changes of
/// settings are held back. What is on its way and breaks off, or turns out to be another document, leaves
/// nothing.
class DocumentService {
public:
    /// How many documents may be on their way at once, and for how many seconds one may stand still.
    static constexpr std::size_t MAX_UPLOADS = 16;
    static constexpr long long UPLOAD_PATIENCE = 60;

    /// All have to outlive the service. Forgets what an earlier process did not finish.
    DocumentService(DocumentStore& documents, SettingsStore const& nodes, SettingsService const& settings,
                    std::function<long long()> now, Recorder recorder = {});

    Protocol::DocumentsAnswer list(Protocol::DocumentsQuery const& query) const;
    Protocol::DocumentPiece piece(Protocol::DocumentPieceQuery const& query) const;
    /// Throws Error unless documents of that digest count at a node that the grant covers.
    void requireTold(std::string const& sha256, Policy::Grant const& to) const;
    Protocol::DocumentUploadAnswer put(Protocol::DocumentUpload const& piece);
    Protocol::StoredDocument remove(Protocol::DocumentRemoval const& removal);
    /// Forgets what has stood still for too long.
    void dropStalled();

private:
    struct Upload {
        std::string node;
        std::string name;
        long long received = 0;
        long long lastAt = 0;
        Base::Sha256 digest = {};
    };
    using Uploads = std::map<long long, Upload>;

    Uploads::iterator begin(Protocol::DocumentUpload const& piece);
    Uploads::iterator goOn(Protocol::DocumentUpload const& piece);
    bool take(Uploads::iterator upload, Protocol::DocumentUpload const& piece);
    void finish(long long content, Protocol::DocumentUpload const& piece);
    void requirePlace(Protocol::DocumentUpload const& piece) const;
    void requireNode(std::string const& id) const;
    void drop(Uploads::iterator upload);
    void makeRoom();

    DocumentStore& documents_;
    SettingsStore const& nodes_;
    SettingsService const& settings_;
    std::function<long long()> now_;
    Recorder recorder_;
    /// By the number of the content.
    Uploads uploads_;
};

} // namespace VlServiced
