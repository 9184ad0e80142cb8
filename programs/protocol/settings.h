#pragma once
// The settings of nodes as client and service speak of them: what counts at a node, and the tree of nodes.

#include "vlservice/json/json.h"

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

namespace Protocol {

/// Asks what counts at a node.
struct SettingsQuery {
    static constexpr char const* KIND = "settings";
    static constexpr char const* IN_WORDS = "a query for settings";
    static constexpr std::size_t MAX_PARTS = 20;

    /// The id of the node; the empty text is the root.
    std::string id;
    /// Names of settings parts; none are all.
    std::vector<std::string> parts;
    /// Whether the channels are to be told that letters leave the service by.
    bool carriers = false;
    /// Whether values and origins are to be those that would count if the node had none of its own.
    bool inherited = false;

    SettingsQuery() = default;
    SettingsQuery(std::string nodeId, std::vector<std::string> wantedParts);
    /// Throws Error when there is no id, or on a wrong type.
    explicit SettingsQuery(json::Object const& object);
    /// With "query", which says that it is one.
    json::Object serialize() const;

    struct Keys;
};

/// What one part of a node's settings says. The three are objects by key.
struct PartSettings {
    /// The node's own values, in the form that a set command takes.
    json::Object own;
    /// Every key with the value that counts.
    json::Object values;
    /// The id of the node that the value comes from, or JSON null for a built-in value; for a list that is
    /// inherited by elements an array of these.
    json::Object origins;

    PartSettings() = default;
    explicit PartSettings(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

struct SettingsAnswer {
    std::string id;
    /// Whether the node is stored.
    bool known = false;
    /// The ids from the node to the root.
    std::vector<std::string> chain;
    /// The form of PartSettings by the part's name, in the order of the question.
    json::Object parts;
    /// Where that was asked: the types of carriers by their channels. Older services tell of none.
    json::Value carriers;

    SettingsAnswer() = default;
    explicit SettingsAnswer(json::Object const& object);
    json::Object serialize() const;

    /// A part's settings; empty ones when the answer has none of that name.
    PartSettings part(std::string const& name) const;
    /// Whether the service sends notices; nothing where it did not say so.
    std::optional<bool> sendsNotices() const;

    struct Keys;
};

/// Asks what would count otherwise, if the own values of a part of a node were replaced.
struct SettingsImpactQuery {
    static constexpr char const* KIND = "settings_impact";
    static constexpr char const* IN_WORDS = "a query for what settings would change";

    std::string id;
    std::string part;
    /// In the form that a set command takes.
    json::Object own;

    SettingsImpactQuery() = default;
    SettingsImpactQuery(std::string nodeId, std::string partName, json::Object values);
    /// Throws Error when there is no id, or on a wrong type.
    explicit SettingsImpactQuery(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

/// Replaces all own values of a node at once, if they still are what was read.
struct SettingsReplacement {
    static constexpr char const* KIND = "replace_settings";
    static constexpr char const* IN_WORDS = "a replacement of settings";

    std::string id;
    /// Both by the names of parts, in the form that a set command takes; one that is left out has no values.
    json::Object was;
    json::Object own;

    SettingsReplacement() = default;
    SettingsReplacement(std::string nodeId, json::Object valuesBefore, json::Object values);
    /// Throws Error when there is no id, or on a wrong type.
    explicit SettingsReplacement(json::Object const& object);
    json::Object serialize() const;
};

struct SettingsReplacedAnswer {
    /// As they are stored.
    json::Object own;

    SettingsReplacedAnswer() = default;
    explicit SettingsReplacedAnswer(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

/// A node at which some settings of the part would have another value.
struct ImpactedNode {
    std::string id;
    std::vector<std::string> keys;

    ImpactedNode() = default;
    ImpactedNode(std::string nodeId, std::vector<std::string> changedKeys);
    explicit ImpactedNode(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

struct SettingsImpactAnswer {
    std::vector<ImpactedNode> nodes;

    SettingsImpactAnswer() = default;
    explicit SettingsImpactAnswer(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

/// A node of the tree of all nodes.
struct TreeNode {
    std::string id;
    /// Its own, not an inherited one.
    std::string description;
    /// Whether nobody may send for it, or for one above it.
    bool disabled = false;
    /// The names of the parts that it has own values of.
    std::vector<std::string> parts;
    std::vector<TreeNode> children;

    TreeNode() = default;
    explicit TreeNode(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

} // namespace Protocol
