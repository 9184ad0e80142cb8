#include "programs/vlserviced/store/document_store.h"

namespace VlServiced {

using Protocol::StoredDocument;

DocumentStore::DocumentStore(Database::Connection& database) : database_(database) {}

std::vector<StoredDocument> DocumentStore::at(std::string const& node) const {
    Database::Rows rows = database_.query("SELECT name, bytes, sha256, put_at FROM documents "
                                          "JOIN document_contents ON number = content "
                                          "WHERE node = $1 ORDER BY name",
                                          node);
    std::vector<StoredDocument> documents;
    while (rows.next()) {
        StoredDocument& document = documents.emplace_back();
        document.node = node;
        document.name = rows.text(0);
        document.bytes = rows.number(1);
        document.sha256 = rows.text(2);
        document.putAt = rows.number(3);
    }
    return documents;
}

std::optional<long long> DocumentStore::numberOf(std::string const& sha256) const {
    Database::Rows rows = database_.query("SELECT number FROM document_contents WHERE sha256 = $1", sha256);
    return rows.next() ? std::optional(rows.number(0)) : std::nullopt;
}

std::vector<std::string> DocumentStore::nodesOf(std::string const& sha256) const {
    Database::Rows rows = database_.query("SELECT DISTINCT node FROM documents JOIN document_contents "
                                          "ON number = content WHERE sha256 = $1",
                                          sha256);
    std::vector<std::string> nodes;
    while (rows.next())
        nodes.push_back(rows.text(0));
    return nodes;
}

std::optional<std::string> DocumentStore::piece(std::string const& sha256, long long offset) const {
    std::optional<long long> const content = numberOf(sha256);
    if (!content)
        return std::nullopt;
    Database::Rows rows =
        database_.query("SELECT substr(data, CAST(1 + $2 - place AS INTEGER)) FROM document_pieces "
                        "WHERE content = $1 AND place <= $2 ORDER BY place DESC LIMIT 1",
                        *content, offset);
    return rows.next() ? rows.text(0) : std::string();
}

long long DocumentStore::begin() {
    Database::Rows rows = database_.query(
        "INSERT INTO document_contents (bytes, touched_at) VALUES (0, clock_ms()) RETURNING number");
    rows.next();
    long long const number = rows.number(0);
    // Carried out in full when there is nothing left of it.
    rows.next();
    return number;
}

void DocumentStore::add(long long content, std::string_view piece) {
    Database::Transaction transaction(database_);
    database_.change("INSERT INTO document_pieces (content, place, data) "
                     "SELECT number, bytes, $2 FROM document_contents WHERE number = $1",
                     content, Database::Bytes{piece});
    database_.change(
        "UPDATE document_contents SET bytes = bytes + $1, touched_at = clock_ms() WHERE number = $2",
        piece.size(), content);
    transaction.commit();
}

void DocumentStore::finish(long long content, StoredDocument const& document) {
    Database::Transaction transaction(database_, Database::Transaction::ALONE);
    std::optional<long long> const known = numberOf(document.sha256);
    if (known)
        drop(content);
    else
        database_.change("UPDATE document_contents SET sha256 = $1 WHERE number = $2", document.sha256,
                         content);
    database_.change("INSERT INTO documents (node, name, content, put_at) VALUES ($1, $2, $3, $4) "
                     "ON CONFLICT (node, name) DO UPDATE SET content = excluded.content, "
                     "put_at = excluded.put_at",
                     document.node, document.name, known.value_or(content), document.putAt);
    transaction.commit();
}

void DocumentStore::drop(long long content) {
    database_.change("DELETE FROM document_contents WHERE number = $1 AND sha256 IS NULL", content);
}

void DocumentStore::dropUnfinished(long long seconds) {
    database_.change("DELETE FROM document_contents WHERE sha256 IS NULL AND touched_at <= clock_ms() - $1",
                     database_.isSqlite() ? 0 : seconds * 1000);
}

void DocumentStore::remove(std::string const& node, std::string const& name) {
    database_.change("DELETE FROM documents WHERE node = $1 AND name = $2", node, name);
}

} // namespace VlServiced
