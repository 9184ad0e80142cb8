#pragma once
// Jobs as client and service speak of them: their states, questions about them, changes and the answers.

#include "programs/protocol/letter.h"
#include "vlservice/json/json.h"

#include <array>
#include <cstddef>
#include <string>
#include <vector>

namespace Protocol {

/// The way of a job.
enum class JobState {
    /// On record; the pages still lie with the client alone.
    Accepted,
    /// The container is in the outbox and stays there until the job is due or released.
    Held,
    /// The container is in the outbox.
    Queued,
    /// The container lies in the upload folder under a temporary name and is about to get its own.
    Submitting,
    /// The container is in the upload folder.
    Submitted,
    /// The container was taken from the upload folder.
    Lodged,
    /// The carrier reported that the mailing is done.
    Delivered,
    /// Given up; the problem says why.
    Failed,
    /// A person has called it back before it was handed over.
    Cancelled,
    /// A trial run: the container is in the outbox, and nothing is handed over.
    Tried,
    /// Its letters go out by carriers, each by itself.
    Delivering,
};

inline constexpr std::array ALL_JOB_STATES{JobState::Accepted,   JobState::Held,      JobState::Queued,
                                           JobState::Submitting, JobState::Submitted, JobState::Lodged,
                                           JobState::Delivered,  JobState::Failed,    JobState::Cancelled,
                                           JobState::Tried,      JobState::Delivering};

/// The name under which a state is kept and told.
char const* stateName(JobState state);
/// Throws Error when no state has that name.
JobState stateNamed(std::string const& name);
/// The names of the states that the first clients did not know.
std::vector<std::string> laterStates();
/// The state as a client is told that knows, of the later states, those of these names alone.
JobState toldTo(std::vector<std::string> const& knownLater, JobState state);

/// A question about jobs; what is empty is no restriction.
struct JobsQuery {
    static constexpr char const* KIND = "jobs";
    static constexpr char const* IN_WORDS = "a query for jobs";
    /// How many jobs are told of at most.
    static constexpr long long MAX_JOBS = 1000;
    /// How long an answer is held at most, in milliseconds.
    static constexpr long long MAX_WAIT = 20'000;
    static constexpr std::size_t MAX_STATES = 100;
    /// How many letters are told of at most, those of the first jobs.
    static constexpr std::size_t MAX_LETTERS = 10'000;

    /// The pack database.
    std::string folder;
    std::string database;
    /// Pack ids, MAX_JOBS at most.
    std::vector<std::string> ids;
    /// The youngest, when there are more.
    long long limit = MAX_JOBS;
    /// How long the answer may be held while one of the jobs of `ids` waits for its pages to be fetched and
    /// nothing is in its way; milliseconds.
    long long wait = 0;
    /// Whether the jobs' letters are to be told of.
    bool letters = false;
    /// The later states that the asker knows. Others are told it as what they come closest to.
    std::vector<std::string> knownStates = laterStates();

    JobsQuery() = default;
    /// Throws Error on a wrong type.
    explicit JobsQuery(json::Object const& object);
    /// With "query", which says that it is one.
    json::Object serialize() const;

    struct Keys;
};

struct JobReport {
    std::string id;
    JobState state = JobState::Accepted;
    std::string title;
    /// The settings node that it is sent for.
    std::string cfgId;
    std::string folder;
    std::string database;
    long long documents = 0;
    long long pages = 0;
    /// Seconds since the epoch: when it was put on record, and since when it is in its state.
    long long accepted = 0;
    long long changed = 0;
    /// Why it failed, or what keeps it where it is.
    std::string problem;
    /// What has taken longer than the node's settings allow.
    std::string alarm;
    /// Whether it is to be handed on.
    bool toUpload = false;
    /// Until when it is held, or will be, seconds since the epoch; 0 when that is not known.
    long long due = 0;
    /// Where the container lies.
    std::string container;
    /// Where they were asked for and go by carriers, or some of them do; in their order.
    std::vector<LetterReport> letters;
    /// How many of its letters are not told of since there are too many.
    long long lettersLeftOut = 0;
    /// Where letters were asked for, in their order.
    std::vector<NoticeReport> notices;
    long long noticesLeftOut = 0;

    JobReport() = default;
    /// Throws Error on a state that is not known.
    explicit JobReport(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

/// Whether a job, or what is told of it, waits for its pages to be fetched and nothing is in its way.
template<typename Job>
bool waitsForPages(Job const& job) {
    return job.state == JobState::Accepted && job.problem.empty();
}

/// In the order of their acceptance.
struct JobsAnswer {
    std::vector<JobReport> jobs;

    JobsAnswer() = default;
    explicit JobsAnswer(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

/// What a person may do to a job.
enum class JobAction {
    Hold,
    Release,
    Cancel,
    /// Has it handed on, as soon as that can be.
    Upload,
};

/// "hold"
char const* actionName(JobAction action);

/// Asks for a change of jobs.
struct JobsChange {
    static constexpr char const* KIND = "change_jobs";
    static constexpr char const* IN_WORDS = "a change of jobs";

    JobAction action = JobAction::Hold;
    /// Pack ids, JobsQuery::MAX_JOBS at most.
    std::vector<std::string> ids;

    JobsChange() = default;
    JobsChange(JobAction wanted, std::vector<std::string> packIds);
    /// Throws Error on an action that there is not, when there are no ids, and on a wrong type.
    explicit JobsChange(json::Object const& object);
    /// With "query", as the questions have it.
    json::Object serialize() const;

    struct Keys;
};

/// A job that stays as it is, and why.
struct JobRefusal {
    std::string id;
    std::string why;

    JobRefusal() = default;
    JobRefusal(std::string packId, std::string reason);
    explicit JobRefusal(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

struct JobsChangeAnswer {
    /// As they are now, in the order of their acceptance.
    std::vector<JobReport> jobs;
    std::vector<JobRefusal> refused;

    JobsChangeAnswer() = default;
    explicit JobsChangeAnswer(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

} // namespace Protocol
