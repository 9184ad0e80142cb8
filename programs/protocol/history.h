#pragma once
// What people have changed in a service, as client and service speak of it.

#include "vlservice/json/json.h"

#include <optional>
#include <string>
#include <vector>

namespace Protocol {

/// Asks for changes of settings, documents, tokens and jobs.
struct HistoryQuery {
    static constexpr char const* KIND = "history";
    static constexpr char const* IN_WORDS = "a query for the history";
    static constexpr long long MAX_ENTRIES = 1000;

    /// The id of the node, for its changes and those of all below it; nothing for all nodes that the asker's
    /// token covers.
    std::optional<std::string> id;
    /// The youngest, when there are more.
    long long limit = MAX_ENTRIES;

    HistoryQuery() = default;
    /// Throws Error on a wrong type.
    explicit HistoryQuery(json::Object const& object);
    /// With "query", which says that it is one.
    json::Object serialize() const;

    struct Keys;
};

struct HistoryEntry {
    /// Seconds since the epoch.
    long long at = 0;
    /// The name of the token.
    std::string who;
    /// The node that it belongs to.
    std::string id;
    /// Such as "settings po", "token office" or "mailing ID".
    std::string what;
    /// Empty for what was not, or is not any more.
    std::string was;
    std::string is;

    HistoryEntry() = default;
    explicit HistoryEntry(json::Object const& object);
    json::Object serialize() const;
    bool operator==(HistoryEntry const&) const = default;

    struct Keys;
};

/// In the order in which they happened.
struct HistoryAnswer {
    std::vector<HistoryEntry> entries;

    HistoryAnswer() = default;
    explicit HistoryAnswer(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

} // namespace Protocol
