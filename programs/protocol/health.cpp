#include "programs/protocol/health.h"

#include "programs/protocol/query.h"
#include "programs/protocol/rows.h"

#include <algorithm>
#include <iterator>
#include <utility>

namespace Protocol {
namespace {

constexpr std::pair<HealthState, char const*> STATES[] = {
    {HealthState::Well, "well"},
    {HealthState::Doubtful, "doubtful"},
    {HealthState::Bad, "bad"},
};

class StateKey {
public:
    constexpr explicit StateKey(char const* name) : name_(name) {}

    void read(json::Object const& from, HealthCheck& into) const {
        std::string const name = from.get(name_).textOrEmpty();
        auto const found = std::ranges::find_if(STATES, [&](auto const& row) { return row.second == name; });
        into.state = found == std::end(STATES) ? HealthState::Doubtful : found->first;
    }
    void write(HealthCheck const& from, json::Object& into) const {
        into.set(name_, healthStateName(from.state));
    }

private:
    char const* name_;
};

} // namespace

struct HealthCheck::Keys {
    static constexpr std::tuple TABLE{
        Always{"name", &HealthCheck::name},
        StateKey{"state"},
        Always{"says", &HealthCheck::says},
        Always{"remedy", &HealthCheck::remedy},
    };
};

struct HealthAnswer::Keys {
    static constexpr std::tuple TABLE{
        Always{"now", &HealthAnswer::now},
        Always{"checks", &HealthAnswer::checks},
    };
};

char const* healthStateName(HealthState state) {
    return std::ranges::find(STATES, state, &std::pair<HealthState, char const*>::first)->second;
}

HealthCheck HealthCheck::well(std::string name, std::string says) {
    return {std::move(name), HealthState::Well, std::move(says), {}};
}

HealthCheck::HealthCheck(std::string ofWhat, HealthState inState, std::string line, std::string whatHelps)
    : name(std::move(ofWhat)), state(inState), says(std::move(line)), remedy(std::move(whatHelps)) {}

HealthCheck::HealthCheck(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object HealthCheck::serialize() const { return writeRecord(*this); }

json::Object HealthQuery::serialize() { return question(KIND); }

HealthAnswer::HealthAnswer(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object HealthAnswer::serialize() const { return writeRecord(*this); }

} // namespace Protocol
