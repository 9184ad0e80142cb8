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
    case JobState::Delivering:
        return (outbox / job.containerName()).string();
    case JobState::Submitted:
        return (std::filesystem::path(job.uploadFolder) / job.containerName()).string();
    default:
        return {};
    }
}

/// Of both, the container's state and that of the letters that go by carriers, the one that is behind.
JobState stateOf(Job const& job) {
    constexpr JobState FROM_BEHIND[] = {JobState::Queued,     JobState::Submitting, JobState::Submitted,
                                        JobState::Delivering, JobState::Failed,     JobState::Lodged};
    for (JobState const state : FROM_BEHIND)
        if (job.lettersState && (job.state == state || job.lettersState == state))
            return state;
    return job.state;
}

std::string problemOf(Job const& job) {
    std::string const between = job.problem.empty() || job.lettersProblem.empty() ? "" : "; ";
    return job.problem + between + job.lettersProblem;
}

/// A letter in a container is where that is.
LetterState stateInContainer(JobState container) {
    switch (container) {
    case JobState::Submitted:
        return LetterState::HandedOver;
    case JobState::Lodged:
        return LetterState::Accepted;
    case JobState::Delivered:
        return LetterState::Delivered;
    case JobState::Failed:
        return LetterState::Failed;
    default:
        return LetterState::Waiting;
    }
}

Protocol::LetterReport reportOf(StoredLetter const& letter, Job const& job) {
    Protocol::LetterReport report;
    report.number = letter.id.number;
    report.key = letter.id.key();
    report.channel = letter.channel;
    report.state = letter.byCarrier ? letter.state : stateInContainer(job.state);
    report.says = letter.byCarrier ? letter.says : "in the mailing's container";
    report.changed = letter.byCarrier ? letter.changedAt : job.changedAt;
    report.tried = letter.tried;
    return report;
}

Protocol::NoticeReport reportOf(StoredLetter const& notice) {
    Protocol::NoticeReport report;
    report.number = -notice.id.number;
    report.key = notice.id.key();
    report.letter = notice.notice.letter;
    report.state = notice.state;
    report.says = notice.says;
    report.changed = notice.changedAt;
    return report;
}

/// Tells of letters, and of notices, until there are too many for one answer.
class LetterList {
public:
    explicit LetterList(LetterStore const& letters) : letters_(letters) {}

    void tell(Job const& job, Protocol::JobReport& report) {
        if (!job.isDivided)
            return;
        tellOfLetters(job, report);
        tellOfNotices(job, report);
    }

private:
    void tellOfLetters(Job const& job, Protocol::JobReport& report) {
        for (StoredLetter const& letter : letters_.ofJob(job.pack.packId, left_))
            report.letters.push_back(reportOf(letter, job));
        left_ -= report.letters.size();
        report.lettersLeftOut =
            letters_.countOfJob(job.pack.packId) - static_cast<long long>(report.letters.size());
    }
    void tellOfNotices(Job const& job, Protocol::JobReport& report) {
        for (StoredLetter const& notice : letters_.noticesOf(job.pack.packId, noticesLeft_))
            report.notices.push_back(reportOf(notice));
        noticesLeft_ -= report.notices.size();
        report.noticesLeftOut =
            letters_.countOfNotices(job.pack.packId) - static_cast<long long>(report.notices.size());
    }

    LetterStore const& letters_;
    std::size_t left_ = Protocol::JobsQuery::MAX_LETTERS;
    std::size_t noticesLeft_ = Protocol::JobsQuery::MAX_LETTERS;
};

Protocol::JobReport reportOf(Job const& job) {
    Protocol::JobReport report;
    report.id = job.pack.packId;
    report.state = stateOf(job);
    report.title = job.title;
    report.cfgId = job.cfgId;
    report.folder = job.pack.folder;
    report.database = job.pack.database;
    report.documents = job.documents;
    report.pages = job.pages;
    report.accepted = job.acceptedAt;
    report.changed = job.changedAt;
    report.problem = problemOf(job);
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
                              LetterStore const& letters, SettingsService const& settings,
                              std::filesystem::path const& outbox, long long now, Policy::Grant const& to) {
    Alarms alarms(settings, now);
    LetterList letterList(letters);
    Protocol::JobsAnswer answer;
    auto const limit = static_cast<std::size_t>(std::min(query.limit, Protocol::JobsQuery::MAX_JOBS));
    for (Job const& job : jobs.matching({query.folder, query.database, query.ids, to.node}, limit)) {
        if (!to.covers(job.cfgId))
            continue;
        Protocol::JobReport& report = answer.jobs.emplace_back(reportOf(job));
        report.alarm = alarms.of(job);
        report.container = containerOf(job, outbox);
        if (query.letters)
            letterList.tell(job, report);
        tellAs(Protocol::toldTo(query.knownStates, report.state), report);
    }
    return answer;
}

} // namespace VlServiced
