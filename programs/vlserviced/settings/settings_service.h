#pragma once
// What the service does with settings, in terms of node ids and JSON.

#include "programs/policy/limits.h"
#include "programs/protocol/settings.h"
#include "programs/vlserviced/settings/service_settings.h"
#include "programs/vlserviced/store/history.h"
#include "programs/vlserviced/store/settings_store.h"

#include <functional>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace VlServiced {

/// Every operation that takes an id throws Error when that is not well-formed; each that changes something,
/// while changes are held back.
class SettingsService {
public:
    using Clock = std::function<Policy::Moment()>;

    /// The store has to outlive the service.
    explicit SettingsService(SettingsStore& store, Clock clock = &localClock, Recorder recorder = {});

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

    /// What counts for the mailings of a node; kept until settings change.
    Policy::Rules rules(std::string const& id) const;
    /// Where a node has a pack preset from, for messages.
    std::string sourceOfPackPreset(std::string const& id, std::string const& name) const;

    /// Replaces the node's own values of a part by those of what was sent; nothing, or nothing of its own,
    /// leaves the node without own values. Of the part "presets" those are refused that a node above has
    /// locked, and delays that never end.
    void setPart(std::string const& id, std::string const& part, json::Value const& sent);
    /// What would count otherwise if a part's own values were replaced so, at the node and all below it.
    Protocol::SettingsImpactAnswer impact(Protocol::SettingsImpactQuery const& query) const;
    /// Replaces all own values of a node by setPart()'s rules, all of them or none. Throws Error when they are
    /// not any more what the asker has read.
    Protocol::SettingsReplacedAnswer replace(Protocol::SettingsReplacement const& replacement);
    /// Adds the node, when it is new, and tests that all its settings can be read. With `reset`, its own
    /// values are erased first; those of the root cannot be.
    void update(std::string const& id, bool reset);
    void remove(std::string const& id);

    /// Puts on record that a mailing of the node went by a pack preset, where that is one that expires
    /// unused.
    void notePresetUse(std::string const& id, std::string const& packPreset);
    /// Removes the presets of all nodes that expire and that nobody has used for long.
    void removeUnusedPresets();

    /// Throws Error while changes are held back.
    void requireChangeable() const;

    /// As they were when they were read last; somebody has to tell when others change them.
    ServiceSettings service() const;
    /// Has all settings read anew: another service may have changed them.
    void forgetRead() const;
    /// The folders of uploads and carriers get marks, and their identities go on record with them. A
    /// carrier's folder that was set before stays the one that it was.
    void changeService(json::Object const& changes);
    /// Puts the identity of the upload folder on record when it is not. Throws std::exception when the folder
    /// is not there.
    void recogniseUploadFolder();
    /// The same for those of carriers, as far as they are there.
    void recogniseCarrierFolders();
    /// Works while changes are held back: it is what lifts that.
    void suspend(int bits);

    static Policy::Moment localClock();

private:
    void noteNode(std::string const& id, bool wasKnown) const;
    bool holdsChangesBack() const;
    /// Changes the service's settings as they are on record, whoever else changes them. `what` is for the
    /// record of what people change; null where nobody has.
    void changeStored(char const* what, std::function<ServiceSettings(ServiceSettings const&)> const& change);

    SettingsStore& store_;
    Clock clock_;
    Recorder recorder_;
    mutable std::map<std::string, Policy::Rules> rules_;
    mutable std::optional<ServiceSettings> service_;
};

} // namespace VlServiced
