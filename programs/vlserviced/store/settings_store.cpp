#include "programs/vlserviced/store/settings_store.h"

#include "programs/base/error.h"
#include "programs/vlserviced/store/node_id.h"
#include "vlservice/cfg/id.h"
#include "vlservice/json/json_text.h"

#include <SQLiteCpp/Statement.h>
#include <SQLiteCpp/Transaction.h>

#include <sstream>

namespace VlServiced {
namespace {

std::string textOf(json::Object const& object) {
    std::ostringstream text;
    text << object;
    return text.str();
}

json::Object objectIn(SQLite::Column const& column) {
    return json::strToObject(column.getText(), static_cast<std::size_t>(column.getBytes()));
}

} // namespace

SettingsStore::SettingsStore(SQLite::Database& database) : database_(database) {}

bool SettingsStore::contains(std::string const& id) const {
    SQLite::Statement query(database_, "SELECT 1 FROM nodes WHERE id = ?");
    query.bindNoCopy(1, id);
    return query.executeStep();
}

std::vector<SettingsNode> SettingsStore::nodes() const {
    SQLite::Statement query(database_, "SELECT id, part, CASE part WHEN 'app' THEN json END FROM nodes "
                                       "LEFT JOIN parts ON node = id ORDER BY id, part");
    std::vector<SettingsNode> nodes;
    while (query.executeStep()) {
        std::string id = query.getColumn(0).getString();
        if (nodes.empty() || nodes.back().id != id)
            nodes.push_back({std::move(id), {}, {}});
        if (!query.getColumn(1).isNull())
            nodes.back().parts.push_back(query.getColumn(1).getString());
        if (!query.getColumn(2).isNull())
            nodes.back().description = objectIn(query.getColumn(2)).get("descr").textOrEmpty();
    }
    return nodes;
}

json::Object SettingsStore::parts(std::string const& id) const {
    SQLite::Statement query(database_, "SELECT part, json FROM parts WHERE node = ?");
    query.bindNoCopy(1, id);
    json::Object parts;
    while (query.executeStep())
        parts.set(query.getColumn(0).getText(), objectIn(query.getColumn(1)));
    return parts;
}

std::vector<std::string> SettingsStore::nodesWithText(std::string const& part,
                                                      std::string const& text) const {
    SQLite::Statement query(database_, "SELECT node FROM parts WHERE part = ? AND instr(json, ?) > 0");
    query.bindNoCopy(1, part);
    query.bindNoCopy(2, text);
    std::vector<std::string> nodes;
    while (query.executeStep())
        nodes.push_back(query.getColumn(0).getString());
    return nodes;
}

long long SettingsStore::bytesOf(std::string const& id) const {
    SQLite::Statement query(database_, "SELECT ifnull(sum(length(json)), 0) FROM parts WHERE node = ?");
    query.bindNoCopy(1, id);
    query.executeStep();
    return query.getColumn(0).getInt64();
}

std::vector<SettingsLevel> SettingsStore::chain(std::string const& id) const {
    // One state of the tree for all levels.
    SQLite::Transaction const reading(database_);
    std::vector<SettingsLevel> levels;
    long long bytes = 0;
    for (Cfg::Id const& level : Cfg::Id(id, false).allIds()) {
        // An id that ends in a slash has the root twice in its chain.
        if (!levels.empty() && levels.back().id == level.str())
            continue;
        // Before anything is parsed: a tree of JSON takes many times what its text does.
        if ((bytes += bytesOf(level.str())) > MAX_CHAIN_BYTES)
            throw Base::Error("the settings that count at node " + id + " are too large, more than " +
                              std::to_string(MAX_CHAIN_BYTES) + " bytes of JSON: let its nodes hold less");
        levels.push_back({level.str(), parts(level.str())});
    }
    return levels;
}

void SettingsStore::addChain(std::string const& id) {
    // Known nodes end the way up: what is above them is known too.
    std::vector<std::string> missing;
    for (std::string at = id; !contains(at); at = parentNodeId(at))
        missing.push_back(at);
    SQLite::Statement insertion(database_, "INSERT INTO nodes (id, parent) VALUES (?, ?)");
    for (auto at = missing.rbegin(); at != missing.rend(); ++at) {
        insertion.bind(1, *at);
        insertion.bind(2, parentNodeId(*at));
        insertion.exec();
        insertion.reset();
    }
    if (!missing.empty())
        requireRoomForNodes();
}

/// With those that the transaction has added.
void SettingsStore::requireRoomForNodes() const {
    SQLite::Statement query(database_, "SELECT count(*), sum(length(CAST(id AS BLOB))) FROM nodes");
    query.executeStep();
    if (query.getColumn(0).getInt64() > MAX_NODES || query.getColumn(1).getInt64() > MAX_IDS_BYTES)
        throw Base::Error("there is no room for more nodes: " + std::to_string(MAX_NODES) +
                          " are possible, whose ids have " + std::to_string(MAX_IDS_BYTES) +
                          " bytes together; remove some first");
}

void SettingsStore::add(std::string const& id) {
    SQLite::Transaction transaction(database_, SQLite::TransactionBehavior::IMMEDIATE);
    addChain(id);
    transaction.commit();
}

void SettingsStore::setPart(std::string const& id, std::string const& part, json::Value const& value) {
    std::string const text = value ? textOf(value.toObject()) : std::string();
    if (text.size() > MAX_PART_BYTES)
        throw Base::Error("the settings \"" + part + "\" of node " + id + " are too large: they have " +
                          std::to_string(text.size()) + " bytes, and " + std::to_string(MAX_PART_BYTES) +
                          " are possible");
    SQLite::Transaction transaction(database_, SQLite::TransactionBehavior::IMMEDIATE);
    addChain(id);
    SQLite::Statement change(database_, value ? "INSERT INTO parts (node, part, json) VALUES (?1, ?2, ?3) "
                                                "ON CONFLICT DO UPDATE SET json = excluded.json"
                                              : "DELETE FROM parts WHERE node = ?1 AND part = ?2");
    change.bind(1, id);
    change.bind(2, part);
    if (value)
        change.bind(3, text);
    change.exec();
    transaction.commit();
}

void SettingsStore::clear(std::string const& id) {
    SQLite::Transaction transaction(database_, SQLite::TransactionBehavior::IMMEDIATE);
    addChain(id);
    SQLite::Statement deletion(database_, "DELETE FROM parts WHERE node = ?");
    deletion.bind(1, id);
    deletion.exec();
    transaction.commit();
}

void SettingsStore::remove(std::string const& id) {
    if (id.empty())
        throw Base::Error("the root cannot be removed");
    SQLite::Transaction transaction(database_, SQLite::TransactionBehavior::IMMEDIATE);
    if (!contains(id))
        throw Base::Error("there is no node " + id);
    SQLite::Statement children(database_, "SELECT count(*), min(id) FROM nodes WHERE parent = ?");
    children.bind(1, id);
    children.executeStep();
    if (int const count = children.getColumn(0).getInt(); count > 0)
        throw Base::Error("node " + id + " has " + std::to_string(count) +
                          (count == 1 ? " child" : " children") + " (" + children.getColumn(1).getString() +
                          "): remove what is below it first");
    SQLite::Statement deletion(database_, "DELETE FROM nodes WHERE id = ?");
    deletion.bind(1, id);
    deletion.exec();
    transaction.commit();
}

json::Object SettingsStore::serviceSettings() const {
    SQLite::Statement query(database_, "SELECT json FROM service_settings");
    return query.executeStep() ? objectIn(query.getColumn(0)) : json::Object();
}

void SettingsStore::setServiceSettings(json::Object const& settings) {
    SQLite::Statement change(database_, "INSERT INTO service_settings (one, json) VALUES (1, ?) "
                                        "ON CONFLICT DO UPDATE SET json = excluded.json");
    change.bind(1, textOf(settings));
    change.exec();
}

} // namespace VlServiced
