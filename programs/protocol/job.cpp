#include "programs/protocol/job.h"

#include "programs/protocol/query.h"
#include "programs/protocol/rows.h"

#include <algorithm>
#include <utility>

namespace Protocol {
namespace {

constexpr std::array<std::pair<JobState, char const*>, ALL_JOB_STATES.size()> STATE_NAMES{{
    {JobState::Accepted, "accepted"},
    {JobState::Queued, "queued"},
    {JobState::Submitting, "submitting"},
    {JobState::Submitted, "submitted"},
    {JobState::Lodged, "lodged"},
    {JobState::Delivered, "delivered"},
    {JobState::Failed, "failed"},
}};

/// A state stands as its name, and one that is missing is no state.
class StateRow {
public:
    constexpr explicit StateRow(char const* name) : name_(name) {}

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
    };
};

struct JobReport::Keys {
    static constexpr std::tuple TABLE{
        Always{"id", &JobReport::id},
        StateRow{"state"},
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
        json::Key{"container", &JobReport::container},
    };
};

struct JobsAnswer::Keys {
    static constexpr std::tuple TABLE{
        Always{"jobs", &JobsAnswer::jobs},
    };
};

char const* stateName(JobState state) {
    return std::find_if(STATE_NAMES.begin(), STATE_NAMES.end(),
                        [&](auto const& row) { return row.first == state; })
        ->second;
}

JobState stateNamed(std::string const& name) {
    auto const found = std::find_if(STATE_NAMES.begin(), STATE_NAMES.end(),
                                    [&](auto const& row) { return row.second == name; });
    if (found == STATE_NAMES.end())
        throw Base::Error("there is a job in the state \"" + name +
                          "\", which this program does not know: use the version that wrote it");
    return found->first;
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

} // namespace Protocol
