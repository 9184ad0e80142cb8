#pragma once
// What people have changed, as the database keeps it: who, when, at which node, what was and what is.

#include "programs/database/connection.h"
#include "programs/policy/rights.h"
#include "programs/protocol/history.h"
#include "vlservice/json/json.h"

#include <functional>
#include <string>
#include <utility>
#include <vector>

namespace VlServiced {

/// An entry is written in the transaction of its change. What the service does of its own leaves none.
class History {
public:
    /// How long entries are kept.
    static constexpr long long KEPT_DAYS = 3650;

    /// The database has to outlive the history. `now` is in seconds since the epoch.
    History(Database::Connection& database, std::function<long long()> now)
        : database_(database), now_(std::move(now)) {}

    /// Whoever acts while it lives.
    class Person {
    public:
        Person(History& history, std::string name)
            : history_(history), former_(std::exchange(history.who_, std::move(name))) {}
        ~Person() { history_.who_ = std::move(former_); }
        Person(Person const&) = delete;
        Person& operator=(Person const&) = delete;

    private:
        History& history_;
        std::string former_;
    };

    /// Empty while the service acts of its own.
    std::string const& who() const { return who_; }
    Database::Connection& database() { return database_; }
    void note(std::string const& node, std::string const& what, std::string const& was,
              std::string const& is);

    /// The youngest of the node and of all below it.
    std::vector<Protocol::HistoryEntry> of(std::string const& node, long long limit) const;
    void removeOld();

private:
    Database::Connection& database_;
    std::function<long long()> now_;
    std::string who_;
};

/// What writes into a history, or into none.
class Recorder {
public:
    Recorder() = default;
    Recorder(History& history) : history_(&history) {}

    /// Carries out a change and notes of it as a whole or not at all.
    template<typename Steps>
    void together(Steps steps) const {
        if (!history_)
            return steps();
        Database::Transaction transaction(history_->database());
        steps();
        transaction.commit();
    }
    /// Nothing where both are the same.
    void note(std::string const& node, std::string const& what, std::string const& was,
              std::string const& is) const;
    /// The keys that differ, with their values, long ones by their digests.
    void note(std::string const& node, std::string const& what, json::Object const& was,
              json::Object const& is) const;

    std::string who() const { return history_ ? history_->who() : std::string(); }
    /// Carries out something for a person who asked for it before.
    template<typename Steps>
    void as(std::string const& who, Steps steps) const {
        if (!history_)
            return steps();
        History::Person const acting(*history_, who);
        steps();
    }

private:
    History* history_ = nullptr;
};

} // namespace VlServiced
