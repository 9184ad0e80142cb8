#include "programs/protocol/job.h"

#include "programs/protocol/query.h"
#include "programs/protocol/rows.h"

#include <algorithm>
#include <iterator>
#include <utility>

namespace Protocol {
namespace {

struct StateRow {
    JobState state;
    char const* name;
    /// The same, unless only later clients know it: then what others take for it.
    JobState toOthers;
};

constexpr StateRow STATES[] = {
    {JobState::Accepted, "accepted", JobState::Accepted},
    {JobState::Held, "held", JobState::Queued},
    {JobState::Queued, "queued", JobState::Queued},
    {JobState::Submitting, "submitting", JobState::Submitting},
    {JobState::Submitted, "submitted", JobState::Submitted},
    {JobState::Lodged, "lodged", JobState::Lodged},
    {JobState::Delivered, "delivered", JobState::Delivered},
    {JobState::Failed, "failed", JobState::Failed},
    {JobState::Cancelled, "cancelled", JobState::Failed},
    {JobState::Tried, "tried", JobState::Queued},
    {JobState::Delivering, "delivering", JobState::Submitted},
};
static_assert(std::size(STATES) == ALL_JOB_STATES.size());

StateRow const& rowOf(JobState state) { return *std::ranges::find(STATES, state, &StateRow::state); }

constexpr char const* ACTION = "action";

constexpr std::pair<JobAction, char const*> ACTIONS[] = {
    {JobAction::Hold, "hold"},
    {JobAction::Release, "release"},
    {JobAction::Cancel, "cancel"},
    {JobAction::Upload, "upload"},
};

/// A state stands as its name, and one that is missing is no state.
class StateKey {
public:
    constexpr explicit StateKey(char const* name) : name_(name) {}

    void read(json::Object const& from, JobReport& into) const {
        into.state = stateNamed(from.get(name_).textOrEmpty());
    }
    void write(JobReport const& from, json::Object& into) const { into.set(name_, stateName(from.state)); }
    bool same(JobReport const& a, JobReport const& b) const { return a.state == b.state; }

private:
    char const* name_;
};
} // namespace

struct JobsQuery::Keys {
    static constexpr std::tuple TABLE{
        Asked{"db_host", &JobsQuery::folder, TextForm{}},
        Asked{"db_name", &JobsQuery::database, TextForm{}},
        Asked{"ids", &JobsQuery::ids, TextsForm{MAX_JOBS}},
        Asked{"limit", &JobsQuery::limit, IntegerForm{.lowest = 1}, MAX_JOBS},
        Asked{"wait", &JobsQuery::wait, IntegerForm{}},
        Asked{"letters", &JobsQuery::letters, FlagForm{}},
        Asked{"states", &JobsQuery::knownStates, TextsForm{MAX_STATES}},
    };
};

struct JobReport::Keys {
    static constexpr std::tuple TABLE{
        Always{"id", &JobReport::id},
        StateKey{"state"},
        Always{"title", &JobReport::title},
        Always{"cfg_id", &JobReport::cfgId},
        Always{"db_host", &JobReport::folder},
        Always{"db_name", &JobReport::database},
        Always{"documents", &JobReport::documents},
        Always{"pages", &JobReport::pages},
        Always{"accepted", &JobReport::accepted},
        Always{"changed", &JobReport::changed},
        json::Key{"problem", &JobReport::problem},
        json::Key{"alarm", &JobReport::alarm},
        json::Key{"to_upload", &JobReport::toUpload},
        json::Key{"due", &JobReport::due},
        json::Key{"container", &JobReport::container},
        json::Key{"letters", &JobReport::letters},
        json::Key{"letters_left_out", &JobReport::lettersLeftOut},
        json::Key{"notices", &JobReport::notices},
        json::Key{"notices_left_out", &JobReport::noticesLeftOut},
    };
};

struct JobsAnswer::Keys {
    static constexpr std::tuple TABLE{
        Always{"jobs", &JobsAnswer::jobs},
    };
};

struct JobsChange::Keys {
    /// "action" is not among them.
    static constexpr std::tuple TABLE{
        Asked{"ids", &JobsChange::ids, TextsForm{JobsQuery::MAX_JOBS}},
    };
};

struct JobRefusal::Keys {
    static constexpr std::tuple TABLE{
        Always{"id", &JobRefusal::id},
        Always{"why", &JobRefusal::why},
    };
};

struct JobsChangeAnswer::Keys {
    static constexpr std::tuple TABLE{
        Always{"jobs", &JobsChangeAnswer::jobs},
        Always{"refused", &JobsChangeAnswer::refused},
    };
};

char const* stateName(JobState state) { return rowOf(state).name; }

JobState stateNamed(std::string const& name) {
    auto const found = std::ranges::find(STATES, name, &StateRow::name);
    if (found == std::end(STATES))
        throw Base::Error(Base::Code::VersionMismatch,
                          "there is a job in the state \"" + name +
                              "\", which this program does not know: use the version that wrote it");
    return found->state;
}

std::vector<std::string> laterStates() {
    std::vector<std::string> names;
    for (StateRow const& row : STATES)
        if (row.toOthers != row.state)
            names.emplace_back(row.name);
    return names;
}

JobState toldTo(std::vector<std::string> const& knownLater, JobState state) {
    StateRow const& row = rowOf(state);
    return std::ranges::find(knownLater, row.name) != knownLater.end() ? state : row.toOthers;
}

char const* actionName(JobAction action) {
    return std::ranges::find(ACTIONS, action, &std::pair<JobAction, char const*>::first)->second;
}

JobsQuery::JobsQuery(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }

json::Object JobsQuery::serialize() const {
    json::Object object = question(KIND);
    json::writeKeys(Keys::TABLE, *this, object);
    return object;
}

JobReport::JobReport(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object JobReport::serialize() const { return writeRecord(*this); }

JobsAnswer::JobsAnswer(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object JobsAnswer::serialize() const { return writeRecord(*this); }

JobsChange::JobsChange(JobAction wanted, std::vector<std::string> packIds)
    : action(wanted), ids(std::move(packIds)) {}

JobsChange::JobsChange(json::Object const& object) {
    json::readKeys(Keys::TABLE, object, *this);
    std::string const name = object.get(ACTION).textOrEmpty();
    auto const found = std::ranges::find_if(ACTIONS, [&](auto const& row) { return row.second == name; });
    if (found == std::end(ACTIONS))
        throw Base::Error(
            Base::Code::RequestInvalid,
            "\"action\" of a change of jobs has to be \"hold\", \"release\", \"cancel\" or \"upload\"");
    action = found->first;
    if (ids.empty())
        throw Base::Error(Base::Code::RequestInvalid, "\"ids\" of a change of jobs has to name one at least");
}

json::Object JobsChange::serialize() const {
    json::Object object = question(KIND);
    object.set(ACTION, actionName(action));
    json::writeKeys(Keys::TABLE, *this, object);
    return object;
}

JobRefusal::JobRefusal(std::string packId, std::string reason)
    : id(std::move(packId)), why(std::move(reason)) {}
JobRefusal::JobRefusal(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object JobRefusal::serialize() const { return writeRecord(*this); }

JobsChangeAnswer::JobsChangeAnswer(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object JobsChangeAnswer::serialize() const { return writeRecord(*this); }

} // namespace Protocol
