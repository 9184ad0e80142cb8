#pragma once
// What the service does with settings, in terms of node ids and JSON.

#include "programs/protocol/settings.h"
#include "programs/vlserviced/settings/service_settings.h"
#include "programs/vlserviced/store/settings_store.h"

#include <string>
#include <vector>

namespace VlServiced {

/// Every operation that takes an id throws Error when that is not well-formed; each that changes something,
/// while changes are held back.
class SettingsService {
public:
    /// The store has to outlive the service.
    explicit SettingsService(SettingsStore& store);

    /// The root, with all below it.
    Protocol::TreeNode tree() const;

    struct UsableNode {
        std::string id;
        std::string description;
        bool disabled = false;
    };
    /// The nodes that a user may send for: his own and those above them, less the root. Without a user, all
    /// nodes that are no user's, less the root.
    std::vector<UsableNode> usableNodes(std::string const& user) const;

    /// The effective settings of a node, which need not be stored. No wanted parts are all.
    Protocol::SettingsAnswer effective(Protocol::SettingsQuery const& query) const;
    /// The values of one part that count at a node.
    json::Object values(std::string const& id, std::string const& part) const;

    /// Replaces the node's own values of a part by those of what was sent; nothing, or nothing of its own,
    /// leaves the node without own values.
    void setPart(std::string const& id, std::string const& part, json::Value const& sent);
    /// Adds the node, when it is new, and tests that all its settings can be read. With `reset`, its own
    /// values are erased first; those of the root cannot be.
    void update(std::string const& id, bool reset);
    void remove(std::string const& id);

    ServiceSettings service() const;
    /// An upload folder gets a mark, and its identity goes on record with it.
    void changeService(json::Object const& changes);
    /// Puts the identity of the upload folder on record when it is not. Throws std::exception when the folder
    /// is not there.
    void recogniseUploadFolder();
    /// Works while changes are held back: it is what lifts that.
    void suspend(int bits);

private:
    void requireChangeable() const;

    SettingsStore& store_;
};

} // namespace VlServiced
