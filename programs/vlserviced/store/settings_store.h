#pragma once
// Settings nodes and their own values, as the database keeps them.

#include "programs/database/connection.h"
#include "vlservice/json/json.h"

#include <functional>
#include <string>
#include <vector>

namespace VlServiced {

/// What one node of a chain holds itself: an object from part name to that part's JSON in flat form.
struct SettingsLevel {
    std::string id;
    json::Object parts;
};

/// A node in a list of nodes.
struct SettingsNode {
    std::string id;
    /// Its own, not an inherited one.
    std::string description;
    /// The names of the parts that it has own values of.
    std::vector<std::string> parts;
};

/// The nodes of the settings tree. Ids are texts that checkNodeId has let through. Every change is one
/// transaction and on the disk when the operation returns.
class SettingsStore {
public:
    /// The database has to outlive the store.
    explicit SettingsStore(Database::Connection& database);

    bool contains(std::string const& id) const;
    /// Every node, the root among them, in the order of the texts.
    std::vector<SettingsNode> nodes() const;
    /// An object from part name to the node's own value, in flat form.
    json::Object parts(std::string const& id) const;
    /// The ids of the nodes whose own value of a part has that text in it.
    std::vector<std::string> nodesWithText(std::string const& part, std::string const& text) const;
    /// The node and all above it, the root last. Nodes that are not stored are levels without parts. Throws
    /// Error when they hold more than MAX_CHAIN_BYTES.
    std::vector<SettingsLevel> chain(std::string const& id) const;

    /// Adds the node, and those above it that are not there yet. Throws Error, as the others that add nodes,
    /// when there would be more than MAX_NODES or their ids had more than MAX_IDS_BYTES.
    void add(std::string const& id);
    /// Replaces the node's own value of a part, adding the node when it is new. The empty handle erases it.
    /// Throws Error for more than MAX_PART_BYTES.
    void setPart(std::string const& id, std::string const& part, json::Value const& value);
    /// Replaces all own values of the node, in the form of parts(), by what `change` makes of them while
    /// nobody else changes them; adds the node when it is new.
    void changeParts(std::string const& id, std::function<json::Object(json::Object const&)> const& change);
    /// Erases all own values of the node, and adds it when it is new.
    void clear(std::string const& id);
    /// Throws Error when there is no such node, when it has children, and for the root.
    void remove(std::string const& id);

    /// The service's own settings: one object, empty at first.
    json::Object serviceSettings() const;
    void setServiceSettings(json::Object const& settings);
    /// Replaces them by what `change` makes of them, while nobody else does.
    void changeServiceSettings(std::function<json::Object(json::Object const&)> const& change);

    /// Of the JSON of one part of one node, and of all that a chain holds: an answer has to carry it.
    static constexpr std::size_t MAX_PART_BYTES = 4 << 20;
    static constexpr long long MAX_CHAIN_BYTES = 8 << 20;
    /// Of all nodes: the tree goes out in one answer.
    static constexpr long long MAX_NODES = 20'000;
    static constexpr long long MAX_IDS_BYTES = 4 << 20;

private:
    void addChain(std::string const& id);
    void requireRoomForNodes() const;
    /// How long the JSON texts of a node's parts are.
    long long bytesOf(std::string const& id) const;

    Database::Connection& database_;
};

} // namespace VlServiced
