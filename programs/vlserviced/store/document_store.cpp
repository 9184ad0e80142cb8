#include "programs/vlserviced/store/document_store.h"

#include <SQLiteCpp/Statement.h>
#include <SQLiteCpp/Transaction.h>

#include <cstdint>

namespace VlServiced {

using Protocol::StoredDocument;

DocumentStore::DocumentStore(SQLite::Database& database) : database_(database) {}

std::vector<StoredDocument> DocumentStore::at(std::string const& node) const {
    SQLite::Statement query(database_,
                            "SELECT name, bytes, sha256, put_at FROM documents JOIN document_contents "
                            "ON number = content WHERE node = ? ORDER BY name");
    query.bindNoCopy(1, node);
    std::vector<StoredDocument> documents;
    while (query.executeStep()) {
        StoredDocument& document = documents.emplace_back();
        document.node = node;
        document.name = query.getColumn(0).getString();
        document.bytes = query.getColumn(1).getInt64();
        document.sha256 = query.getColumn(2).getString();
        document.putAt = query.getColumn(3).getInt64();
    }
    return documents;
}

std::optional<long long> DocumentStore::numberOf(std::string const& sha256) const {
    SQLite::Statement query(database_, "SELECT number FROM document_contents WHERE sha256 = ?");
    query.bindNoCopy(1, sha256);
    return query.executeStep() ? std::optional<long long>(query.getColumn(0).getInt64()) : std::nullopt;
}

std::optional<std::string> DocumentStore::piece(std::string const& sha256, long long offset) const {
    std::optional<long long> const content = numberOf(sha256);
    if (!content)
        return std::nullopt;
    SQLite::Statement query(database_, "SELECT substr(data, 1 + ?2 - place) FROM document_pieces "
                                       "WHERE content = ?1 AND place <= ?2 ORDER BY place DESC LIMIT 1");
    query.bind(1, std::int64_t{*content});
    query.bind(2, std::int64_t{offset});
    return query.executeStep() ? query.getColumn(0).getString() : std::string();
}

long long DocumentStore::begin() {
    SQLite::Statement(database_, "INSERT INTO document_contents (bytes) VALUES (0)").exec();
    return database_.getLastInsertRowid();
}

void DocumentStore::add(long long content, std::string_view piece) {
    SQLite::Transaction transaction(database_, SQLite::TransactionBehavior::IMMEDIATE);
    SQLite::Statement insertion(database_,
                                "INSERT INTO document_pieces (content, place, data) "
                                "SELECT number, bytes, ?2 FROM document_contents WHERE number = ?1");
    insertion.bind(1, std::int64_t{content});
    insertion.bindNoCopy(2, piece.data(), static_cast<int>(piece.size()));
    insertion.exec();
    SQLite::Statement growth(database_, "UPDATE document_contents SET bytes = bytes + ? WHERE number = ?");
    growth.bind(1, static_cast<std::int64_t>(piece.size()));
    growth.bind(2, std::int64_t{content});
    growth.exec();
    transaction.commit();
}

void DocumentStore::finish(long long content, StoredDocument const& document) {
    SQLite::Transaction transaction(database_, SQLite::TransactionBehavior::IMMEDIATE);
    std::optional<long long> const known = numberOf(document.sha256);
    if (known) {
        drop(content);
    } else {
        SQLite::Statement completion(database_, "UPDATE document_contents SET sha256 = ? WHERE number = ?");
        completion.bind(1, document.sha256);
        completion.bind(2, std::int64_t{content});
        completion.exec();
    }
    SQLite::Statement change(database_, "INSERT INTO documents (node, name, content, put_at) "
                                        "VALUES (?, ?, ?, ?) ON CONFLICT DO UPDATE SET "
                                        "content = excluded.content, put_at = excluded.put_at");
    change.bind(1, document.node);
    change.bind(2, document.name);
    change.bind(3, std::int64_t{known.value_or(content)});
    change.bind(4, std::int64_t{document.putAt});
    change.exec();
    transaction.commit();
}

void DocumentStore::drop(long long content) {
    SQLite::Statement deletion(database_,
                               "DELETE FROM document_contents WHERE number = ? AND sha256 IS NULL");
    deletion.bind(1, std::int64_t{content});
    deletion.exec();
}

void DocumentStore::dropUnfinished() {
    SQLite::Statement(database_, "DELETE FROM document_contents WHERE sha256 IS NULL").exec();
}

void DocumentStore::remove(std::string const& node, std::string const& name) {
    SQLite::Statement deletion(database_, "DELETE FROM documents WHERE node = ? AND name = ?");
    deletion.bind(1, node);
    deletion.bind(2, name);
    deletion.exec();
}

} // namespace VlServiced
