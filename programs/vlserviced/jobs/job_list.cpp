#include "programs/vlserviced/jobs/job_list.h"

#include "programs/base/error.h"

#include <algorithm>
#include <optional>
#include <utility>

namespace VlServiced {
namespace {

constexpr std::size_t MAX_JOBS = 1000;

[[noreturn]] void refuse(char const* key, char const* wanted) {
    throw Base::Error(std::string("\"") + key + "\" of a query for jobs has to be " + wanted);
}

std::string textIn(json::Object const& query, char const* key) {
    json::Value const value = query.get(key);
    if (value && !value.isString())
        refuse(key, "a text");
    return value.textOrEmpty();
}

std::vector<std::string> textsIn(json::Object const& query, char const* key) {
    json::Value const value = query.get(key);
    if (!value)
        return {};
    if (!value.isArray())
        refuse(key, "an array of texts");
    std::vector<std::string> texts;
    for (json::Value const& element : value.toArray()) {
        if (!element.isString())
            refuse(key, "an array of texts");
        texts.push_back(element.textOrEmpty());
    }
    return texts;
}

std::size_t limitIn(json::Object const& query) {
    json::Value const value = query.get("limit");
    if (!value)
        return MAX_JOBS;
    if (!value.isInt() || value.toInt() < 1)
        refuse("limit", "an integer above 0");
    return static_cast<std::size_t>(std::min(value.toInt(), static_cast<long long>(MAX_JOBS)));
}

/// How long a job may stay in a state, by the settings of its node.
struct AlarmRule {
    JobState state;
    char const* hoursKey;
    char const* text;
};
constexpr AlarmRule ALARM_RULES[] = {
    {JobState::Submitted, "submitted_alarm_hours",
     "nobody has taken the container from the upload folder for "},
    {JobState::Lodged, "lodged_alarm_hours", "the carrier has not reported for "},
};

std::string alarmOf(Job const& job, SettingsService const& settings, long long now) {
    auto const rule = std::find_if(std::begin(ALARM_RULES), std::end(ALARM_RULES),
                                   [&](AlarmRule const& r) { return r.state == job.state; });
    if (rule == std::end(ALARM_RULES))
        return {};
    json::Value const inet = settings.effective(job.cfgId, {"inet"}).get("parts").toObject().get("inet");
    long long const allowed = inet.toObject().get("values").toObject().get(rule->hoursKey).intOrZero();
    long long const waited = (now - job.changedAt) / 3600;
    return allowed > 0 && waited >= allowed ? rule->text + std::to_string(waited) + " hours" : std::string();
}

std::string containerOf(Job const& job, std::filesystem::path const& outbox) {
    switch (job.state) {
    case JobState::Queued:
    case JobState::Submitting:
        return (outbox / job.containerName()).string();
    case JobState::Submitted:
        return (std::filesystem::path(job.uploadFolder) / job.containerName()).string();
    default:
        return {};
    }
}

void setUnlessEmpty(json::Object& object, char const* key, std::string const& text) {
    if (!text.empty())
        object.set(key, text);
}

json::Object objectOf(Job const& job, std::string const& alarm, std::string const& container) {
    json::Object object{{"id", job.pack.packId},      {"state", stateName(job.state)},
                        {"title", job.title},         {"cfg_id", job.cfgId},
                        {"db_host", job.pack.folder}, {"db_name", job.pack.database},
                        {"documents", job.documents}, {"pages", job.pages},
                        {"accepted", job.acceptedAt}, {"changed", job.changedAt}};
    setUnlessEmpty(object, "problem", job.problem);
    setUnlessEmpty(object, "alarm", alarm);
    if (job.toUpload)
        object.set("to_upload", true);
    setUnlessEmpty(object, "container", container);
    return object;
}

} // namespace

json::Object listJobs(json::Object const& query, JobStore const& jobs, SettingsService const& settings,
                      std::filesystem::path const& outbox, long long now) {
    JobFilter const filter{textIn(query, "db_host"), textIn(query, "db_name"), textsIn(query, "ids")};
    json::Array list;
    for (Job const& job : jobs.matching(filter, limitIn(query)))
        list.append(objectOf(job, alarmOf(job, settings, now), containerOf(job, outbox)));
    return {{"jobs", list}};
}

} // namespace VlServiced
