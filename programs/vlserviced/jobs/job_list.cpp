#include "programs/vlserviced/jobs/job_list.h"

#include "vlservice/cfg/inet.h"

#include <algorithm>
#include <map>
#include <utility>

namespace VlServiced {
namespace {

template<Cfg::InetFieldIdxs I>
int hours(Cfg::Inet const& inet) {
    return inet.value<I>();
}

/// How long a job may stay in a state, by the settings of its node.
struct AlarmRule {
    JobState state;
    int (*hours)(Cfg::Inet const&);
    char const* text;
};
constexpr AlarmRule ALARM_RULES[] = {
    {JobState::Submitted, hours<Cfg::InetFieldIdxs::SubmittedAlarmHours>,
     "nobody has taken the container from the upload folder for "},
    {JobState::Lodged, hours<Cfg::InetFieldIdxs::LodgedAlarmHours>, "the carrier has not reported for "},
};

/// Tells what has taken too long. Jobs of one node are asked about together, so each node's settings are
/// resolved once.
class Alarms {
public:
    Alarms(SettingsService const& settings, long long now) : settings_(settings), now_(now) {}

    std::string of(Job const& job) {
        if (job.state == JobState::Queued && job.toUpload && hasNoUploadFolder_)
            return "the service has no upload folder";
        auto const rule = std::find_if(std::begin(ALARM_RULES), std::end(ALARM_RULES),
                                       [&](AlarmRule const& r) { return r.state == job.state; });
        if (rule == std::end(ALARM_RULES))
            return {};
        long long const allowed = rule->hours(settingsOf(job.cfgId));
        long long const waited = (now_ - job.changedAt) / 3600;
        return allowed > 0 && waited >= allowed ? rule->text + std::to_string(waited) + " hours"
                                                : std::string();
    }

private:
    Cfg::Inet const& settingsOf(std::string const& node) {
        auto const found = byNode_.find(node);
        if (found != byNode_.end())
            return found->second;
        return byNode_.emplace(node, Cfg::Inet(settings_.values(node, Cfg::Inet::PART_NAME), false, false))
            .first->second;
    }

    SettingsService const& settings_;
    long long now_;
    bool hasNoUploadFolder_ = settings_.service().uploadFolder().empty();
    std::map<std::string, Cfg::Inet> byNode_;
};

std::string containerOf(Job const& job, std::filesystem::path const& outbox) {
    switch (job.state) {
    case JobState::Held:
    case JobState::Queued:
    case JobState::Submitting:
    case JobState::Tried:
        return (outbox / job.containerName()).string();
    case JobState::Submitted:
        return (std::filesystem::path(job.uploadFolder) / job.containerName()).string();
    default:
        return {};
    }
}

Protocol::JobReport reportOf(Job const& job) {
    Protocol::JobReport report;
    report.id = job.pack.packId;
    report.state = job.state;
    report.title = job.title;
    report.cfgId = job.cfgId;
    report.folder = job.pack.folder;
    report.database = job.pack.database;
    report.documents = job.documents;
    report.pages = job.pages;
    report.accepted = job.acceptedAt;
    report.changed = job.changedAt;
    report.problem = job.problem;
    report.toUpload = job.toUpload;
    report.due = job.state == JobState::Accepted || job.state == JobState::Held ? job.due : 0;
    return report;
}

/// To a client that does not know the state, its nearest one says why it is where it is.
void tellAs(JobState state, Protocol::JobReport& report) {
    if (report.state == JobState::Cancelled && state == JobState::Failed)
        report.problem = "it was cancelled";
    report.state = state;
}

} // namespace

Protocol::JobsAnswer listJobs(Protocol::JobsQuery const& query, JobStore const& jobs,
                              SettingsService const& settings, std::filesystem::path const& outbox,
                              long long now) {
    Alarms alarms(settings, now);
    Protocol::JobsAnswer answer;
    auto const limit = static_cast<std::size_t>(std::min(query.limit, Protocol::JobsQuery::MAX_JOBS));
    for (Job const& job : jobs.matching({query.folder, query.database, query.ids}, limit)) {
        Protocol::JobReport& report = answer.jobs.emplace_back(reportOf(job));
        report.alarm = alarms.of(job);
        report.container = containerOf(job, outbox);
        tellAs(Protocol::toldTo(query.knownStates, job.state), report);
    }
    return answer;
}

} // namespace VlServiced
