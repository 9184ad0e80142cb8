#include "programs/vlserviced/settings/settings_service.h"

#include "programs/base/error.h"
#include "programs/base/local_offset.h"
#include "programs/carriers/folder_carrier.h"
#include "programs/policy/auto_presets.h"
#include "programs/vlserviced/settings/parts.h"
#include "programs/vlserviced/settings/preset_rules.h"
#include "programs/vlserviced/settings/upload_folder.h"
#include "programs/vlserviced/store/node_id.h"
#include "vlservice/cfg/id.h"
#include "vlservice/presets/presets.h"

#include <algorithm>
#include <ctime>
#include <unordered_set>
#include <utility>

namespace VlServiced {
namespace {

using Children = std::map<std::string, std::vector<SettingsNode const*>>;

json::Object carrierTypes(Protocol::Carriers const& carriers) {
    json::Object types;
    for (auto const& [channel, carrier] : carriers)
        types.set(channel, Protocol::carrierTypeName(carrier.type));
    return types;
}

Protocol::TreeNode branch(SettingsNode const& node, Children const& children,
                          ServiceSettings const& service) {
    Protocol::TreeNode branching;
    branching.id = node.id;
    branching.description = node.description;
    branching.disabled = service.isDisabled(node.id);
    branching.parts = node.parts;
    if (auto const found = children.find(node.id); found != children.end())
        for (SettingsNode const* child : found->second)
            branching.children.push_back(branch(*child, children, service));
    return branching;
}

bool isNodeOf(std::string const& user, std::string const& id) {
    return id.substr(0, id.find(Cfg::Id::CFG_ID_DELIM)) == Cfg::Id::USER_PREFIX + user;
}

/// Empty where there are none.
json::Object valuesIn(json::Object const& parts, std::string const& part) {
    json::Value const values = parts.get(part);
    return values.isObject() ? values.toObject() : json::Object();
}

json::Object ownValues(SettingsStore const& store, std::string const& id, std::string const& part) {
    return valuesIn(store.parts(id), part);
}

/// What would count if the first node had no values of its own, and those that it has.
json::Object inheritedParts(std::vector<SettingsLevel> chain, std::vector<std::string> const& names) {
    json::Object const own = std::exchange(chain.front().parts, {});
    json::Object parts;
    for (auto const& [name, part] : resolve(chain, names)) {
        Protocol::PartSettings settings(part.toObject());
        settings.own = valuesIn(own, name);
        parts.set(name, settings.serialize());
    }
    return parts;
}

/// The empty text for no folder.
std::string identityOf(std::string const& uploadFolder) {
    return uploadFolder.empty() ? std::string() : UploadFolder(uploadFolder, {}).identity().text();
}

/// The empty text for one that cannot be had.
std::string identityOfCarriers(std::string const& folder) {
    try {
        return Carriers::identityOfFolder(folder);
    } catch (std::bad_alloc const&) {
        throw;
    } catch (std::exception const&) {
        return {};
    }
}

/// A folder that a channel had before stays the one that it was: an empty place where a share is to be
/// mounted has the same name.
std::map<std::string, std::string> carrierFolders(Protocol::Carriers const& carriers,
                                                  Protocol::Carriers const& before) {
    std::map<std::string, std::string> identities;
    for (auto const& [channel, settings] : carriers) {
        if (settings.folder.empty())
            continue;
        auto const former = before.find(channel);
        bool const isKnown = former != before.end() && former->second.folder == settings.folder &&
                             !former->second.folderIdentity.empty();
        identities[channel] = isKnown ? former->second.folderIdentity : identityOfCarriers(settings.folder);
    }
    return identities;
}

} // namespace

SettingsService::SettingsService(SettingsStore& store, Clock clock, Recorder recorder)
    : store_(store), clock_(std::move(clock)), recorder_(recorder) {}

Policy::Moment SettingsService::localClock() { return {std::time(nullptr), &Base::localOffset}; }

Protocol::TreeNode SettingsService::tree() const {
    std::vector<SettingsNode> const nodes = store_.nodes();
    Children children;
    for (SettingsNode const& node : nodes)
        if (!node.id.empty())
            children[parentNodeId(node.id)].push_back(&node);
    // The root's text comes first in any order.
    return branch(nodes.front(), children, service());
}

std::vector<SettingsService::UsableNode> SettingsService::usableNodes(std::string const& user) const {
    std::vector<SettingsNode> const nodes = store_.nodes();
    // Who may use a node is a question of tokens: his nodes and what stands above them, token by token.
    std::unordered_set<std::string> ofUser;
    for (SettingsNode const& node : nodes)
        if (!user.empty() && isNodeOf(user, node.id))
            for (std::string at = node.id; !at.empty() && ofUser.insert(at).second;)
                at = parentNodeId(at);
    ServiceSettings const settings = service();
    std::vector<UsableNode> usable;
    for (SettingsNode const& node : nodes) {
        bool const isUsable = user.empty() ? Cfg::Id::isParentIdStr(node.id) : ofUser.contains(node.id);
        if (isUsable && !node.id.empty())
            usable.push_back({node.id, node.description, settings.isDisabled(node.id)});
    }
    return usable;
}

Protocol::SettingsAnswer SettingsService::effective(Protocol::SettingsQuery const& query) const {
    checkNodeId(query.id);
    std::vector<SettingsLevel> const chain = store_.chain(query.id);
    Protocol::SettingsAnswer answer;
    answer.id = query.id;
    answer.known = store_.contains(query.id);
    for (SettingsLevel const& level : chain)
        answer.chain.push_back(level.id);
    std::vector<std::string> const& parts = query.parts.empty() ? partNames() : query.parts;
    answer.parts = query.inherited ? inheritedParts(chain, parts) : resolve(chain, parts);
    if (query.carriers)
        answer.carriers = carrierTypes(service().carriers());
    return answer;
}

json::Object SettingsService::values(std::string const& id, std::string const& part) const {
    return effective({id, {part}}).part(part).values;
}

void SettingsService::setPart(std::string const& id, std::string const& part, json::Value const& sent) {
    requireChangeable();
    checkNodeId(id);
    json::Value const own = ownForm(part, sent);
    if (own && part == Cfg::Presets::PART_NAME)
        requireAllowedPresets(own.toObject(), store_.chain(id), clock_());
    rules_.clear();
    recorder_.together([&] {
        json::Object const was = ownValues(store_, id, part);
        bool const wasKnown = store_.contains(id);
        store_.setPart(id, part, own);
        noteNode(id, wasKnown);
        recorder_.note(id, "settings " + part, was, own ? own.toObject() : json::Object());
    });
}

void SettingsService::noteNode(std::string const& id, bool wasKnown) const {
    if (!wasKnown)
        recorder_.note(id, "node", "", "added");
}

namespace {

json::Object ownForms(json::Object const& sent) {
    json::Object own;
    for (auto const& [part, values] : sent)
        if (json::Value const form = ownForm(part, values))
            own.set(part, form);
    return own;
}

void requireUnchanged(json::Object const& stored, Protocol::SettingsReplacement const& replacement) {
    for (std::string const& part : partNames())
        if (!(valuesIn(stored, part) == valuesIn(replacement.was, part)))
            throw Base::Error(Base::Code::SettingsChanged,
                              "the settings \"" + part + "\" of " +
                                  (replacement.id.empty() ? "the root" : "node " + replacement.id) +
                                  " were changed by somebody else since they were read; look at both and "
                                  "save what is to stay");
}

} // namespace

Protocol::SettingsReplacedAnswer SettingsService::replace(Protocol::SettingsReplacement const& replacement) {
    requireChangeable();
    std::string const& id = replacement.id;
    checkNodeId(id);
    Protocol::SettingsReplacedAnswer answer;
    answer.own = ownForms(replacement.own);
    if (json::Value const presets = answer.own.get(Cfg::Presets::PART_NAME))
        requireAllowedPresets(presets.toObject(), store_.chain(id), clock_());
    rules_.clear();
    recorder_.together([&] {
        noteNode(id, store_.contains(id));
        store_.changeParts(id, [&](json::Object const& stored) {
            requireUnchanged(stored, replacement);
            for (std::string const& part : partNames())
                recorder_.note(id, "settings " + part, valuesIn(stored, part), valuesIn(answer.own, part));
            return answer.own;
        });
    });
    return answer;
}

void SettingsService::update(std::string const& id, bool reset) {
    requireChangeable();
    checkNodeId(id);
    // An id that is missing from a request reads as the root.
    if (reset && id.empty())
        throw Base::Error(Base::Code::RequestInvalid,
                          "the root cannot be reset as a whole: set its parts to nothing one by one");
    rules_.clear();
    recorder_.together([&] {
        bool const wasKnown = store_.contains(id);
        json::Object const was = store_.parts(id);
        reset ? store_.clear(id) : store_.add(id);
        noteNode(id, wasKnown);
        for (auto const& [part, values] : was)
            if (reset)
                recorder_.note(id, "settings " + std::string(part), values.toObject(), json::Object());
    });
    resolve(store_.chain(id), partNames());
}

void SettingsService::remove(std::string const& id) {
    requireChangeable();
    checkNodeId(id);
    rules_.clear();
    recorder_.together([&] {
        json::Object const was = store_.parts(id);
        store_.remove(id);
        for (auto const& [part, values] : was)
            recorder_.note(id, "settings " + std::string(part), values.toObject(), json::Object());
        recorder_.note(id, "node", "there", "");
    });
}

namespace {

/// Of the keys of a part those whose values differ.
std::vector<std::string> differingKeys(std::vector<SettingsLevel> const& was,
                                       std::vector<SettingsLevel> const& is, std::string const& part) {
    auto const valuesOf = [&](std::vector<SettingsLevel> const& chain) {
        return Protocol::PartSettings(resolve(chain, {part}).get(part).toObject()).values;
    };
    json::Object const before = valuesOf(was);
    json::Object const after = valuesOf(is);
    std::vector<std::string> keys;
    for (auto const& [key, value] : after)
        if (!(before.get(key) == value))
            keys.emplace_back(key);
    return keys;
}

/// Asks what would change below a node. Nodes without values of their own have what those above them have.
class Impact {
public:
    Impact(SettingsStore const& store, std::string const& part, json::Value own, std::string const& id)
        : store_(store), part_(part), own_(std::move(own)), id_(id) {}

    std::vector<std::string> const& at(std::string const& node, bool hasOwn) {
        auto const known = byNode_.find(node);
        if (known != byNode_.end())
            return known->second;
        bool const isLikeItsParent = node != id_ && !hasOwn;
        return byNode_.emplace(node, isLikeItsParent ? at(parentNodeId(node)) : found(node)).first->second;
    }

private:
    std::vector<std::string> at(std::string const& node) {
        return at(node, static_cast<bool>(store_.parts(node).get(part_)));
    }

    std::vector<std::string> found(std::string const& node) const {
        std::vector<SettingsLevel> const was = store_.chain(node);
        std::vector<SettingsLevel> is = was;
        for (SettingsLevel& level : is)
            if (level.id == id_) {
                json::Object parts;
                for (auto const& [name, values] : level.parts)
                    if (name != part_)
                        parts.set(name, values);
                if (own_)
                    parts.set(part_, own_);
                level.parts = parts;
            }
        return differingKeys(was, is, part_);
    }

    SettingsStore const& store_;
    std::string part_;
    json::Value own_;
    std::string id_;
    std::map<std::string, std::vector<std::string>> byNode_;
};

} // namespace

Protocol::SettingsImpactAnswer SettingsService::impact(Protocol::SettingsImpactQuery const& query) const {
    checkNodeId(query.id);
    json::Value const own = ownForm(query.part, query.own);
    if (own && query.part == Cfg::Presets::PART_NAME)
        requireAllowedPresets(own.toObject(), store_.chain(query.id), clock_());
    Impact impact(store_, query.part, own, query.id);
    Policy::Grant const reached{{}, {}, query.id};
    std::vector<SettingsNode> nodes = store_.nodes();
    if (!store_.contains(query.id))
        nodes.push_back({query.id, {}, {}});
    Protocol::SettingsImpactAnswer answer;
    for (SettingsNode const& node : nodes) {
        if (!reached.covers(node.id))
            continue;
        bool const hasOwn = std::find(node.parts.begin(), node.parts.end(), query.part) != node.parts.end();
        if (std::vector<std::string> const& keys = impact.at(node.id, hasOwn); !keys.empty())
            answer.nodes.emplace_back(node.id, keys);
    }
    return answer;
}

Policy::Rules SettingsService::rules(std::string const& id) const {
    constexpr std::size_t MOST = 1000;
    if (auto const known = rules_.find(id); known != rules_.end())
        return known->second;
    if (rules_.size() >= MOST)
        rules_.clear();
    Policy::SourcedSettings const settings(effective({id, Policy::Rules::parts()}));
    return rules_.emplace(id, Policy::Rules(settings)).first->second;
}

std::string SettingsService::sourceOfPackPreset(std::string const& id, std::string const& name) const {
    return Policy::SourcedSettings(effective({id, {Cfg::Presets::PART_NAME}})).sourceOfPackPreset(name);
}

void SettingsService::notePresetUse(std::string const& id, std::string const& packPreset) {
    if (!Policy::expiresUnused(packPreset) || holdsChangesBack())
        return;
    std::string const& part = Cfg::Presets::PART_NAME;
    for (SettingsLevel const& level : store_.chain(id))
        if (json::Value const presets = level.parts.get(part))
            if (json::Value const used = Policy::withUse(presets.toObject(), packPreset, clock_().now))
                store_.setPart(level.id, part, used);
}

void SettingsService::removeUnusedPresets() {
    if (holdsChangesBack())
        return;
    std::string const& part = Cfg::Presets::PART_NAME;
    for (std::string const& node : store_.nodesWithText(part, "#auto_"))
        if (json::Value const left =
                Policy::withoutUnused(store_.parts(node).get(part).toObject(), clock_().now))
            store_.setPart(node, part, left);
}

ServiceSettings SettingsService::service() const {
    if (!service_)
        service_.emplace(store_.serviceSettings());
    return *service_;
}

void SettingsService::forgetRead() const {
    rules_.clear();
    service_.reset();
}

void SettingsService::changeStored(char const* what,
                                   std::function<ServiceSettings(ServiceSettings const&)> const& change) {
    service_.reset();
    recorder_.together([&] {
        store_.changeServiceSettings([&](json::Object const& stored) {
            ServiceSettings const former(stored);
            ServiceSettings const changed = change(former);
            if (what)
                recorder_.note({}, what, former.told(), changed.told());
            return changed.stored();
        });
    });
}

void SettingsService::changeService(json::Object const& changes) {
    requireChangeable();
    changeStored("service settings", [&](ServiceSettings const& former) {
        ServiceSettings changed = former.withChanges(changes);
        if (changes.get(Protocol::ServiceSettings::UPLOAD_FOLDER))
            changed = changed.withFolderIdentity(identityOf(changed.uploadFolder()));
        if (changes.get(Protocol::ServiceSettings::CARRIERS))
            changed = changed.withCarrierFolders(carrierFolders(changed.carriers(), former.carriers()));
        return changed;
    });
}

void SettingsService::recogniseUploadFolder() {
    ServiceSettings const settings = service();
    if (!settings.uploadFolder().empty() && settings.uploadFolderIdentity().empty())
        changeStored(nullptr, [](ServiceSettings const& former) {
            return former.withFolderIdentity(identityOf(former.uploadFolder()));
        });
}

void SettingsService::recogniseCarrierFolders() {
    Protocol::Carriers const carriers = service().carriers();
    if (service().withCarrierFolders(carrierFolders(carriers, carriers)).carriers() != carriers)
        changeStored(nullptr, [](ServiceSettings const& former) {
            return former.withCarrierFolders(carrierFolders(former.carriers(), former.carriers()));
        });
}

void SettingsService::suspend(int bits) {
    changeStored("what is held back",
                 [bits](ServiceSettings const& former) { return former.withSuspended(bits); });
}

bool SettingsService::holdsChangesBack() const { return service().isSuspended(Suspended::SettingsChanges); }

void SettingsService::requireChangeable() const {
    if (holdsChangesBack())
        throw Base::Error(Base::Code::ServiceSuspended, "changes of settings are held back at the moment");
}

} // namespace VlServiced
