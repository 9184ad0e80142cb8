#pragma once
// How the service is doing, as it tells itself: what it looked at, what is wrong there, and what helps.

#include "vlservice/json/json.h"

#include <array>
#include <string>
#include <vector>

namespace Protocol {

enum class HealthState {
    Well,
    /// It works, and somebody should look at it.
    Doubtful,
    /// It does not work.
    Bad,
};

/// "doubtful"
char const* healthStateName(HealthState state);

struct HealthCheck {
    /// What was looked at: "disk", or "carrier postal".
    std::string name;
    HealthState state = HealthState::Well;
    /// One line.
    std::string says;
    /// What helps, one line; empty where all is well.
    std::string remedy;

    /// One of Well, with nothing to do about it.
    static HealthCheck well(std::string name, std::string says);

    HealthCheck() = default;
    HealthCheck(std::string ofWhat, HealthState inState, std::string line, std::string whatHelps);
    /// A state that is not known is Doubtful: newer services may tell more of them.
    explicit HealthCheck(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

/// Asks how the service is doing.
struct HealthQuery {
    static constexpr char const* KIND = "health";

    static json::Object serialize();
};

struct HealthAnswer {
    /// The service's clock, in seconds since the epoch.
    long long now = 0;
    std::vector<HealthCheck> checks;

    HealthAnswer() = default;
    explicit HealthAnswer(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

} // namespace Protocol
