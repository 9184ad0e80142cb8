#include "programs/vlserviced/store/settings_store.h"

#include "programs/base/error.h"
#include "programs/vlserviced/store/node_id.h"
#include "vlservice/cfg/id.h"
#include "vlservice/json/json_text.h"

#include <sstream>
#include <string_view>

namespace VlServiced {
namespace {

std::string textOf(json::Object const& object) {
    std::ostringstream text;
    text << object;
    return text.str();
}

json::Object objectIn(std::string_view text) { return json::strToObject(text.data(), text.size()); }

} // namespace

SettingsStore::SettingsStore(Database::Connection& database) : database_(database) {}

bool SettingsStore::contains(std::string const& id) const {
    return database_.query("SELECT 1 FROM nodes WHERE id = $1", id).next();
}

std::vector<SettingsNode> SettingsStore::nodes() const {
    Database::Rows rows = database_.query("SELECT id, part, CASE part WHEN 'app' THEN json END FROM nodes "
                                          "LEFT JOIN parts ON node = id ORDER BY id, part");
    std::vector<SettingsNode> nodes;
    while (rows.next()) {
        std::string id = rows.text(0);
        if (nodes.empty() || nodes.back().id != id)
            nodes.push_back({std::move(id), {}, {}});
        if (!rows.isNull(1))
            nodes.back().parts.push_back(rows.text(1));
        if (!rows.isNull(2))
            nodes.back().description = objectIn(rows.bytes(2)).get("descr").textOrEmpty();
    }
    return nodes;
}

json::Object SettingsStore::parts(std::string const& id) const {
    Database::Rows rows = database_.query("SELECT part, json FROM parts WHERE node = $1", id);
    json::Object parts;
    while (rows.next())
        parts.set(rows.text(0).c_str(), objectIn(rows.bytes(1)));
    return parts;
}

std::vector<std::string> SettingsStore::nodesWithText(std::string const& part,
                                                      std::string const& text) const {
    Database::Rows rows = database_.query(
        "SELECT node FROM parts WHERE part = $1 AND replace(json, $2, '') <> json ORDER BY node", part, text);
    std::vector<std::string> nodes;
    while (rows.next())
        nodes.push_back(rows.text(0));
    return nodes;
}

long long SettingsStore::bytesOf(std::string const& id) const {
    return database_.number("SELECT sum(length(json)) FROM parts WHERE node = $1", id);
}

std::vector<SettingsLevel> SettingsStore::chain(std::string const& id) const {
    // One state of the tree for all levels.
    Database::Transaction const reading(database_, Database::Transaction::SNAPSHOT);
    std::vector<SettingsLevel> levels;
    long long bytes = 0;
    for (Cfg::Id const& level : Cfg::Id(id, false).allIds()) {
        // An id that ends in a slash has the root twice in its chain.
        if (!levels.empty() && levels.back().id == level.str())
            continue;
        // Before anything is parsed: a tree of JSON takes many times what its text does.
        if ((bytes += bytesOf(level.str())) > MAX_CHAIN_BYTES)
            throw Base::Error(Base::Code::TooLarge, "the settings that count at node " + id +
                                                        " are too large, more than " +
                                                        std::to_string(MAX_CHAIN_BYTES) +
                                                        " bytes of JSON: let its nodes hold less");
        levels.push_back({level.str(), parts(level.str())});
    }
    return levels;
}

void SettingsStore::addChain(std::string const& id) {
    // Known nodes end the way up: what is above them is known too.
    std::vector<std::string> missing;
    for (std::string at = id; !contains(at); at = parentNodeId(at))
        missing.push_back(at);
    for (auto at = missing.rbegin(); at != missing.rend(); ++at)
        database_.change("INSERT INTO nodes (id, parent) VALUES ($1, $2)", *at, parentNodeId(*at));
    if (!missing.empty())
        requireRoomForNodes();
}

/// With those that the transaction has added.
void SettingsStore::requireRoomForNodes() const {
    Database::Rows rows = database_.query("SELECT count(*), sum(" + database_.bytesOf("id") + ") FROM nodes");
    rows.next();
    if (rows.number(0) > MAX_NODES || rows.number(1) > MAX_IDS_BYTES)
        throw Base::Error(Base::Code::TooLarge,
                          "there is no room for more nodes: " + std::to_string(MAX_NODES) +
                              " are possible, whose ids have " + std::to_string(MAX_IDS_BYTES) +
                              " bytes together; remove some first");
}

void SettingsStore::add(std::string const& id) {
    Database::Transaction transaction(database_, Database::Transaction::ALONE);
    addChain(id);
    transaction.commit();
}

void SettingsStore::setPart(std::string const& id, std::string const& part, json::Value const& value) {
    std::string const text = value ? textOf(value.toObject()) : std::string();
    if (text.size() > MAX_PART_BYTES)
        throw Base::Error(Base::Code::TooLarge, "the settings \"" + part + "\" of node " + id +
                                                    " are too large: they have " +
                                                    std::to_string(text.size()) + " bytes, and " +
                                                    std::to_string(MAX_PART_BYTES) + " are possible");
    Database::Transaction transaction(database_, Database::Transaction::ALONE);
    addChain(id);
    if (value)
        database_.change("INSERT INTO parts (node, part, json) VALUES ($1, $2, $3) "
                         "ON CONFLICT (node, part) DO UPDATE SET json = excluded.json",
                         id, part, text);
    else
        database_.change("DELETE FROM parts WHERE node = $1 AND part = $2", id, part);
    transaction.commit();
}

void SettingsStore::changeParts(std::string const& id,
                                std::function<json::Object(json::Object const&)> const& change) {
    Database::Transaction transaction(database_, Database::Transaction::ALONE);
    addChain(id);
    json::Object const was = parts(id);
    json::Object const own = change(was);
    for (auto const& [part, values] : was)
        if (!own.get(part))
            setPart(id, part, {});
    for (auto const& [part, values] : own)
        if (!(was.get(part) == values))
            setPart(id, part, values);
    transaction.commit();
}

void SettingsStore::clear(std::string const& id) {
    Database::Transaction transaction(database_, Database::Transaction::ALONE);
    addChain(id);
    database_.change("DELETE FROM parts WHERE node = $1", id);
    transaction.commit();
}

void SettingsStore::remove(std::string const& id) {
    if (id.empty())
        throw Base::Error(Base::Code::NodeInUse, "the root cannot be removed");
    Database::Transaction transaction(database_, Database::Transaction::ALONE);
    if (!contains(id))
        throw Base::Error(Base::Code::NodeUnknown, "there is no node " + id);
    Database::Rows children = database_.query("SELECT count(*), min(id) FROM nodes WHERE parent = $1", id);
    children.next();
    if (long long const count = children.number(0); count > 0)
        throw Base::Error(Base::Code::NodeInUse, "node " + id + " has " + std::to_string(count) +
                                                     (count == 1 ? " child" : " children") + " (" +
                                                     children.text(1) + "): remove what is below it first");
    database_.change("DELETE FROM nodes WHERE id = $1", id);
    transaction.commit();
}

json::Object SettingsStore::serviceSettings() const {
    Database::Rows rows = database_.query("SELECT json FROM service_settings");
    return rows.next() ? objectIn(rows.bytes(0)) : json::Object();
}

void SettingsStore::changeServiceSettings(std::function<json::Object(json::Object const&)> const& change) {
    Database::Transaction transaction(database_, Database::Transaction::ALONE);
    setServiceSettings(change(serviceSettings()));
    transaction.commit();
}

void SettingsStore::setServiceSettings(json::Object const& settings) {
    database_.change("INSERT INTO service_settings (one, json) VALUES (1, $1) "
                     "ON CONFLICT (one) DO UPDATE SET json = excluded.json",
                     textOf(settings));
}

} // namespace VlServiced
