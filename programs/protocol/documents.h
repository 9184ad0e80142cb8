#pragma once
// The documents of nodes, letterheads and attachments, as client and service speak of them: what counts at a
// node, and how documents travel in pieces.

#include "vlservice/json/json.h"

#include <cstddef>
#include <string>
#include <vector>

namespace Protocol {

/// A document that the service keeps at a node.
struct StoredDocument {
    /// That of a file, with its ending; safe as such.
    std::string name;
    /// The id of the node that it lies at.
    std::string node;
    long long bytes = 0;
    /// 64 hexadecimal digits: which version of the document it is.
    std::string sha256;
    /// When it was put there, in seconds since the epoch.
    long long putAt = 0;

    StoredDocument() = default;
    explicit StoredDocument(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

/// Of the whole document, and of each piece on its way.
inline constexpr long long MAX_DOCUMENT_BYTES = 64LL << 20;
inline constexpr long long MAX_PIECE_BYTES = 1LL << 20;
/// At one node: the answer has to carry those of a whole chain.
inline constexpr long long MAX_DOCUMENTS = 500;

/// Asks for the documents that count at a node.
struct DocumentsQuery {
    static constexpr char const* KIND = "documents";
    static constexpr char const* IN_WORDS = "a query for documents";

    /// The id of the node; the empty text is the root.
    std::string id;

    DocumentsQuery() = default;
    explicit DocumentsQuery(std::string nodeId);
    /// Throws Error when there is no id.
    explicit DocumentsQuery(json::Object const& object);
    /// With "query", which says that it is one.
    json::Object serialize() const;
};

/// Those of the node and of all above it, the nearest first, without those that a nearer one of the same name
/// hides; those of one node by their names.
struct DocumentsAnswer {
    std::vector<StoredDocument> documents;

    DocumentsAnswer() = default;
    explicit DocumentsAnswer(json::Object const& object);
    json::Object serialize() const;

    /// The document that an id means, a name with its ending or without: the nearest node that has one
    /// decides, there the whole name comes first and a PDF before others. Nullptr when there is none.
    StoredDocument const* find(std::string const& documentId) const;

    struct Keys;
};

/// Asks for a piece of a version of a document.
struct DocumentPieceQuery {
    static constexpr char const* KIND = "document_piece";
    static constexpr char const* IN_WORDS = "a query for a piece of a document";

    std::string sha256;
    long long offset = 0;

    DocumentPieceQuery() = default;
    DocumentPieceQuery(std::string digest, long long at);
    /// Throws Error on a wrong type.
    explicit DocumentPieceQuery(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

struct DocumentPiece {
    /// In Base64; empty at the end.
    std::string data;

    DocumentPiece() = default;
    explicit DocumentPiece(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

/// Brings a piece of a document that is to lie at a node. The document is there when its last piece is, all
/// at once, and replaces one of its name.
struct DocumentUpload {
    static constexpr char const* KIND = "put_document";
    static constexpr char const* IN_WORDS = "a piece of a document";

    /// The id of the node.
    std::string id;
    std::string name;
    /// Of the whole document.
    std::string sha256;
    long long bytes = 0;
    /// As the answer to the first piece has it; 0 with that.
    long long upload = 0;
    /// Where the piece begins: pieces come in their order.
    long long offset = 0;
    /// In Base64.
    std::string data;

    DocumentUpload() = default;
    /// Throws Error on a wrong type.
    explicit DocumentUpload(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

struct DocumentUploadAnswer {
    /// For the further pieces.
    long long upload = 0;
    /// Whether that was the last piece.
    bool complete = false;

    DocumentUploadAnswer() = default;
    explicit DocumentUploadAnswer(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

/// Has a document removed from the node that it lies at. The answer tells which it was.
struct DocumentRemoval {
    static constexpr char const* KIND = "remove_document";
    static constexpr char const* IN_WORDS = "a removal of a document";

    std::string id;
    /// A name with its ending or without, as DocumentsAnswer::find() takes it.
    std::string document;

    DocumentRemoval() = default;
    DocumentRemoval(std::string nodeId, std::string documentId);
    /// Throws Error when there is no id.
    explicit DocumentRemoval(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

} // namespace Protocol
