#include "programs/vlserviced/settings/document_service.h"

#include "programs/base/base64.h"
#include "programs/base/error.h"
#include "programs/base/plain_text.h"
#include "programs/base/quoting.h"
#include "programs/base/safe_name.h"
#include "programs/vlserviced/store/node_id.h"
#include "vlservice/platform/log.h"

#include <algorithm>
#include <set>
#include <utility>

namespace VlServiced {
namespace {

using Protocol::DocumentUpload;
using Protocol::StoredDocument;

std::string shownNode(std::string const& id) { return id.empty() ? "the root" : "node " + id; }

[[noreturn]] void refuse(DocumentUpload const& piece, std::string const& why) {
    throw Base::Error(Base::Code::DocumentUnreadable, "the document " +
                                                          Base::inQuotes(Base::plainLine(piece.name)) +
                                                          " was not stored: " + why);
}

std::string bytesIn(DocumentUpload const& piece) {
    std::optional<std::string> bytes = Base::fromBase64(piece.data);
    if (!bytes || bytes->empty() || static_cast<long long>(bytes->size()) > Protocol::MAX_PIECE_BYTES)
        refuse(piece, "a piece of it has to be 1 to " + std::to_string(Protocol::MAX_PIECE_BYTES) +
                          " bytes in Base64");
    return std::move(*bytes);
}

[[noreturn]] void refuseMissing(std::string const& sha256) {
    throw Base::Error(Base::Code::DocumentUnknown, "the service has no document of the digest " + sha256 +
                                                       " any more: it was replaced or removed");
}

/// Empty where there is none of that name.
std::string digestOf(std::vector<StoredDocument> const& there, std::string const& name) {
    auto const found = std::ranges::find(there, name, &StoredDocument::name);
    return found == there.end() ? std::string() : found->sha256;
}

} // namespace

DocumentService::DocumentService(DocumentStore& documents, SettingsStore const& nodes,
                                 SettingsService const& settings, std::function<long long()> now,
                                 Recorder recorder)
    : documents_(documents), nodes_(nodes), settings_(settings), now_(std::move(now)), recorder_(recorder) {
    documents_.dropUnfinished(UPLOAD_PATIENCE);
}

Protocol::DocumentsAnswer DocumentService::list(Protocol::DocumentsQuery const& query) const {
    checkNodeId(query.id);
    Protocol::DocumentsAnswer answer;
    std::set<std::string> names;
    for (std::string at = query.id;; at = parentNodeId(at)) {
        for (StoredDocument& document : documents_.at(at))
            if (names.insert(document.name).second)
                answer.documents.push_back(std::move(document));
        if (at.empty())
            return answer;
    }
}

void DocumentService::requireTold(std::string const& sha256, Policy::Grant const& to) const {
    // What lies above the grant's node counts at it, too.
    std::vector<std::string> const nodes = documents_.nodesOf(sha256);
    if (std::ranges::none_of(nodes, [&](std::string const& node) {
            return to.covers(node) || Policy::Grant{{}, {}, node}.covers(to.node);
        }))
        refuseMissing(sha256);
}

Protocol::DocumentPiece DocumentService::piece(Protocol::DocumentPieceQuery const& query) const {
    std::optional<std::string> const bytes = documents_.piece(query.sha256, query.offset);
    if (!bytes)
        refuseMissing(query.sha256);
    Protocol::DocumentPiece piece;
    piece.data = Base::toBase64(*bytes);
    return piece;
}

Protocol::DocumentUploadAnswer DocumentService::put(DocumentUpload const& piece) {
    settings_.requireChangeable();
    dropStalled();
    auto const upload = piece.upload == 0 ? begin(piece) : goOn(piece);
    Protocol::DocumentUploadAnswer answer;
    answer.upload = upload->first;
    try {
        answer.complete = take(upload, piece);
    } catch (Database::QueryError const& failure) {
        drop(upload);
        refuse(piece, failure.what() + std::string("; make room on the disk of the service"));
    } catch (Base::Error const&) {
        drop(upload);
        throw;
    }
    if (answer.complete)
        uploads_.erase(upload);
    return answer;
}

DocumentService::Uploads::iterator DocumentService::begin(DocumentUpload const& piece) {
    requirePlace(piece);
    makeRoom();
    return uploads_.emplace(documents_.begin(), Upload{piece.id, piece.name}).first;
}

DocumentService::Uploads::iterator DocumentService::goOn(DocumentUpload const& piece) {
    auto const upload = uploads_.find(piece.upload);
    if (upload == uploads_.end() || upload->second.node != piece.id || upload->second.name != piece.name)
        refuse(piece, "it was broken off, and nothing of it is kept; put it once more");
    return upload;
}

bool DocumentService::take(Uploads::iterator upload, DocumentUpload const& piece) {
    Upload& state = upload->second;
    std::string const bytes = bytesIn(piece);
    if (piece.offset != state.received || static_cast<long long>(bytes.size()) > piece.bytes - state.received)
        refuse(piece, "its pieces do not fit together; put it once more");
    documents_.add(upload->first, bytes);
    state.digest.add(bytes);
    state.received += static_cast<long long>(bytes.size());
    state.lastAt = now_();
    if (state.received < piece.bytes)
        return false;
    if (state.digest.digest() != piece.sha256)
        refuse(piece, "what arrived is another document than its digest says; put it once more");
    finish(upload->first, piece);
    return true;
}

void DocumentService::finish(long long content, DocumentUpload const& piece) {
    // The node may have been removed in the meantime.
    requireNode(piece.id);
    StoredDocument document;
    document.name = piece.name;
    document.node = piece.id;
    document.sha256 = piece.sha256;
    document.putAt = now_();
    recorder_.together([&] {
        recorder_.note(piece.id, "document " + piece.name, digestOf(documents_.at(piece.id), piece.name),
                       piece.sha256);
        documents_.finish(content, document);
    });
}

void DocumentService::requirePlace(DocumentUpload const& piece) const {
    requireNode(piece.id);
    if (Base::safeFileName(piece.name) != piece.name)
        refuse(piece,
               "that cannot be the name of a document; choose one without / \\ : * ? \" < > |, control "
               "characters and a dot in front, of at most 200 bytes");
    if (piece.bytes < 1 || piece.bytes > Protocol::MAX_DOCUMENT_BYTES)
        refuse(piece, "it has to have 1 byte at least and " +
                          std::to_string(Protocol::MAX_DOCUMENT_BYTES >> 20) +
                          " MiB at most; leave out what is not to be printed");
    std::vector<StoredDocument> const there = documents_.at(piece.id);
    bool const replaces = std::ranges::find(there, piece.name, &StoredDocument::name) != there.end();
    if (!replaces && static_cast<long long>(there.size()) >= Protocol::MAX_DOCUMENTS)
        refuse(piece, shownNode(piece.id) + " has " + std::to_string(Protocol::MAX_DOCUMENTS) +
                          " documents, more are not possible; remove some first");
}

void DocumentService::requireNode(std::string const& id) const {
    checkNodeId(id);
    if (!nodes_.contains(id))
        throw Base::Error(Base::Code::NodeUnknown,
                          "there is no node " + id +
                              "; correct the id, or set something at it first (\"vlmail settings set\")");
}

StoredDocument DocumentService::remove(Protocol::DocumentRemoval const& removal) {
    settings_.requireChangeable();
    requireNode(removal.id);
    Protocol::DocumentsAnswer there;
    there.documents = documents_.at(removal.id);
    StoredDocument const* const document = there.find(removal.document);
    if (!document)
        throw Base::Error(Base::Code::DocumentUnknown,
                          shownNode(removal.id) + " has no document " +
                              Base::inQuotes(Base::plainLine(removal.document)) +
                              " of its own; \"vlmail documents list\" shows which lies where");
    recorder_.together([&] {
        documents_.remove(removal.id, document->name);
        recorder_.note(removal.id, "document " + document->name, document->sha256, "");
    });
    return *document;
}

void DocumentService::dropStalled() {
    for (auto at = uploads_.begin(); at != uploads_.end();) {
        auto const upload = at++;
        if (now_() - upload->second.lastAt > UPLOAD_PATIENCE)
            drop(upload);
    }
}

/// The one that has stood still for the longest makes way.
void DocumentService::makeRoom() {
    // What could not be dropped in its time, for want of room for that.
    if (uploads_.empty())
        documents_.dropUnfinished(UPLOAD_PATIENCE);
    if (uploads_.size() >= MAX_UPLOADS)
        drop(std::min_element(uploads_.begin(), uploads_.end(), [](auto const& a, auto const& b) {
            return a.second.lastAt < b.second.lastAt;
        }));
}

void DocumentService::drop(Uploads::iterator upload) {
    long long const content = upload->first;
    uploads_.erase(upload);
    try {
        documents_.drop(content);
    } catch (Database::QueryError const& failure) {
        Log::Lock(4).logStreamLine() << "What arrived of a document goes with the next one. "
                                     << Base::oneLine(failure.what());
    }
}

} // namespace VlServiced
