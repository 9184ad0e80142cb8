#pragma once
// The documents of nodes, letterheads and attachments, as the database keeps them.

#include "programs/database/connection.h"
#include "programs/protocol/documents.h"

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace VlServiced {

/// Names are safe ones, ids those of nodes that are stored, digests those of what was added. A content is
/// kept once, whatever the number of documents that have it, and goes with the last of them; nobody sees one
/// that is not finished. Every change is one transaction and on the disk when the operation returns.
class DocumentStore {
public:
    /// The database has to outlive the store.
    explicit DocumentStore(Database::Connection& database);

    /// Those that lie at a node itself, by their names.
    std::vector<Protocol::StoredDocument> at(std::string const& node) const;
    /// The nodes that documents of that content lie at.
    std::vector<std::string> nodesOf(std::string const& sha256) const;
    /// The bytes of a content from `offset` to the end of the piece that it lies in; empty at the end,
    /// nothing when no document has such a content.
    std::optional<std::string> piece(std::string const& sha256, long long offset) const;

    /// Begins a content and gives its number.
    long long begin();
    /// Adds to the end of it; a piece has at most Protocol::MAX_PIECE_BYTES.
    void add(long long content, std::string_view piece);
    /// Makes a document of it, which replaces one of that name at that node.
    void finish(long long content, Protocol::StoredDocument const& document);
    /// Forgets a content that is not finished.
    void drop(long long content);
    /// All of them; of services that share the database, those to which nothing was added for so long: others
    /// may be about to finish theirs.
    void dropUnfinished(long long seconds);

    void remove(std::string const& node, std::string const& name);

private:
    std::optional<long long> numberOf(std::string const& sha256) const;

    Database::Connection& database_;
};

} // namespace VlServiced
