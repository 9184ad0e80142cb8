#include "programs/vlserviced/store/job_store.h"

#include "vlservice/json/json_form.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <functional>
#include <iterator>
#include <sstream>
#include <utility>

namespace VlServiced {
namespace {

using Protocol::stateName;
using Protocol::stateNamed;

constexpr char const* JOB_COLUMNS =
    "pack, db_folder, db_name, cfg_id, title, documents, pages, state, problem, to_upload, upload_folder, "
    "accepted_at, changed_at, upload_identity, due, to_hold, trial, divided, letters_state, letters_problem, "
    "fence, submit_fence ";
std::string const SELECT_JOBS = std::string("SELECT ") + JOB_COLUMNS + "FROM jobs ";
/// As isToWorkOn() has it, and the index that holds those alone.
constexpr char const* TO_WORK_ON =
    "(state IN ('accepted', 'submitting') OR (state = 'queued' AND to_upload = 1)) ";

/// The states of which there are few: the others are where jobs rest, or end.
constexpr JobState UNDER_WAY[] = {JobState::Accepted, JobState::Queued, JobState::Submitting,
                                  JobState::Submitted, JobState::Lodged};

Job jobIn(Database::Rows const& row) {
    Job job;
    job.pack.packId = row.text(0);
    job.pack.folder = row.text(1);
    job.pack.database = row.text(2);
    job.cfgId = row.text(3);
    job.title = row.text(4);
    job.documents = row.number(5);
    job.pages = row.number(6);
    job.state = stateNamed(row.text(7));
    job.problem = row.text(8);
    job.toUpload = row.isTrue(9);
    job.uploadFolder = row.text(10);
    job.acceptedAt = row.number(11);
    job.changedAt = row.number(12);
    job.uploadFolderIdentity = row.text(13);
    job.due = row.number(14);
    job.toHold = row.isTrue(15);
    job.isTrial = row.isTrue(16);
    job.isDivided = row.isTrue(17);
    if (std::string const state = row.text(18); !state.empty())
        job.lettersState = stateNamed(state);
    job.lettersProblem = row.text(19);
    job.fence = row.number(20);
    job.submitFence = row.number(21);
    return job;
}

std::vector<Job> jobsIn(Database::Rows rows) {
    std::vector<Job> jobs;
    while (rows.next())
        jobs.push_back(jobIn(rows));
    return jobs;
}

/// What rows have to fulfil, with the texts that go into it.
class Conditions {
public:
    /// An empty text is no restriction. `condition` says where the text goes.
    void add(std::string const& value,
             std::function<std::string(std::string const& placeholder)> const& condition) {
        if (value.empty())
            return;
        values_.push_back(value);
        text_ += (text_.empty() ? "WHERE " : "AND ") + condition('$' + std::to_string(values_.size())) + ' ';
    }
    /// That a column has that text; one that is not to be looked up by an index stands in an expression.
    void addEqual(std::string const& column, std::string const& value, bool isLookedUp) {
        add(value, [&](std::string const& placeholder) {
            return (isLookedUp ? column : "(" + column + " || '')") + " = " + placeholder;
        });
    }
    std::string const& text() const { return text_; }
    Database::Values values() const { return {values_.begin(), values_.end()}; }

private:
    std::string text_;
    std::vector<std::string> values_;
};

/// As a JSON array.
std::string textOf(std::vector<std::string> const& texts) {
    std::ostringstream text;
    text << json::Form<std::vector<std::string>>::write(texts);
    return std::move(text).str();
}

/// For the id of a node, and of those below it, with a slash in front; empty for the root.
std::string patternOfEnd(std::string const& node) {
    if (node.empty())
        return {};
    std::string pattern = "%/";
    for (char const c : node)
        pattern += std::string(c == '%' || c == '_' || c == '!' ? "!" : "") + c;
    return pattern;
}

} // namespace

JobStore::JobStore(Database::Connection& database, Holder holder)
    : database_(database), holder_(std::move(holder)) {}

std::optional<Job> JobStore::find(std::string const& packId) const {
    Database::Rows rows = database_.query(SELECT_JOBS + "WHERE pack = $1", packId);
    return rows.next() ? std::optional(jobIn(rows)) : std::nullopt;
}

std::vector<Job> JobStore::inState(JobState state) const {
    return jobsIn(
        database_.query(SELECT_JOBS + "WHERE state = $1 ORDER BY accepted_at, pack", stateName(state)));
}

std::vector<Job> JobStore::matching(JobFilter const& filter, std::size_t limit) const {
    // Only the conditions that are wanted: one that may hold for every row would keep the indexes out.
    Conditions wanted;
    // Ids say more than all else.
    bool const isLookedUp = filter.packIds.empty();
    wanted.addEqual("db_folder", filter.folder, isLookedUp);
    wanted.addEqual("db_name", filter.database, isLookedUp);
    wanted.add(isLookedUp ? std::string() : textOf(filter.packIds),
               [&](std::string const& ids) { return "pack IN " + database_.elementsOf(ids); });
    // One database makes no difference between small and capital letters here: who asks looks once more.
    wanted.add(patternOfEnd(filter.node),
               [](std::string const& pattern) { return "'/' || cfg_id LIKE " + pattern + " ESCAPE '!'"; });
    std::vector<Job> jobs = jobsIn(database_.queryAll(
        SELECT_JOBS + wanted.text() + "ORDER BY accepted_at DESC, pack DESC LIMIT " + std::to_string(limit),
        wanted.values()));
    std::reverse(jobs.begin(), jobs.end());
    return jobs;
}

std::vector<Job> JobStore::underWay(std::string const& folder, std::string const& database) const {
    std::vector<std::string> states;
    for (JobState const state : UNDER_WAY)
        states.emplace_back(stateName(state));
    Conditions wanted;
    wanted.add(textOf(states),
               [&](std::string const& named) { return "state IN " + database_.elementsOf(named); });
    // What rests and has ended is of the same databases.
    wanted.addEqual("db_folder", folder, false);
    wanted.addEqual("db_name", database, false);
    return jobsIn(
        database_.queryAll(SELECT_JOBS + wanted.text() + "ORDER BY accepted_at, pack", wanted.values()));
}

// The state stands in the text: a bound one would keep the index out, which holds that state alone.
std::vector<Job> JobStore::due(long long now, std::size_t limit) const {
    return jobsIn(database_.query(SELECT_JOBS + database_.by("jobs_by_due") +
                                      "WHERE state = 'held' AND due <= $1 ORDER BY due, pack LIMIT " +
                                      std::to_string(limit),
                                  now));
}

std::optional<long long> JobStore::nextDue() const {
    Database::Rows rows = database_.query("SELECT due FROM jobs " + database_.by("jobs_by_due") +
                                          "WHERE state = 'held' AND due IS NOT NULL ORDER BY due LIMIT 1");
    return rows.next() ? std::optional(rows.number(0)) : std::nullopt;
}

bool JobStore::accept(Job const& job) {
    return database_.change("INSERT INTO jobs (pack, db_folder, db_name, cfg_id, title, documents, pages, "
                            "state, accepted_at, changed_at, to_upload, due, to_hold, trial, try_at) "
                            "VALUES ($1, $2, $3, $4, $5, $6, $7, $8, $9, $9, $10, $11, $12, $13, clock_ms()) "
                            "ON CONFLICT DO NOTHING",
                            job.pack.packId, job.pack.folder, job.pack.database, job.cfgId, job.title,
                            job.documents, job.pages, stateName(JobState::Accepted), job.acceptedAt,
                            job.toUpload, job.due == 0 ? std::nullopt : std::optional(job.due), job.toHold,
                            job.isTrial) == 1;
}

std::vector<Job> JobStore::claim(std::size_t most) {
    std::vector<Job> jobs = jobsIn(
        database_.query("UPDATE jobs SET holder = $1, fence = fence + 1, try_at = clock_ms() + $2 "
                        "WHERE pack IN (SELECT pack FROM jobs " +
                            database_.by("jobs_to_claim") + "WHERE " + TO_WORK_ON +
                            "AND try_at <= clock_ms() ORDER BY try_at, pack LIMIT " + std::to_string(most) +
                            database_.skipLocked() + ") RETURNING " + JOB_COLUMNS,
                        holder_.name, holder_.seconds * 1000));
    std::ranges::sort(jobs, {}, [](Job const& job) { return std::pair(job.acceptedAt, job.pack.packId); });
    return jobs;
}

std::optional<Job> JobStore::claim(std::string const& packId) {
    std::vector<Job> jobs =
        jobsIn(database_.query(std::string("UPDATE jobs SET holder = $1, fence = fence + 1, "
                                           "try_at = clock_ms() + $2 WHERE pack = $3 AND "
                                           "(holder = '' OR try_at <= clock_ms()) AND ") +
                                   TO_WORK_ON + "RETURNING " + JOB_COLUMNS,
                               holder_.name, holder_.seconds * 1000, packId));
    return jobs.empty() ? std::nullopt : std::optional(std::move(jobs.front()));
}

void JobStore::keep(std::vector<std::string> const& packIds) {
    if (!packIds.empty())
        database_.change("UPDATE jobs SET try_at = clock_ms() + $1 WHERE holder = $2 AND pack IN " +
                             database_.elementsOf("$3"),
                         holder_.seconds * 1000, holder_.name, textOf(packIds));
}

void JobStore::letGo(JobKey const& job, long long seconds) {
    database_.change("UPDATE jobs SET holder = '', try_at = clock_ms() + $1 WHERE pack = $2 AND "
                     "holder = $3 AND fence = coalesce(CAST($4 AS BIGINT), fence)",
                     seconds * 1000, job.packId, holder_.name, job.fence);
}

void JobStore::hurry() {
    database_.change(
        std::string("UPDATE jobs SET try_at = 0 WHERE holder = '' AND try_at > clock_ms() AND ") +
        TO_WORK_ON);
}

void JobStore::freeOwn() {
    if (!isShared())
        database_.change("UPDATE jobs SET holder = '', try_at = 0 WHERE holder = $1", holder_.name);
}

bool JobStore::advance(JobKey const& job, JobState from, JobState to, long long now) {
    return told(job.packId,
                database_.change("UPDATE jobs SET state = $1, problem = '', changed_at = $2 WHERE pack = $3 "
                                 "AND state = $4 AND fence = coalesce(CAST($5 AS BIGINT), fence)",
                                 stateName(to), now, job.packId, stateName(from), job.fence));
}

bool JobStore::beginSubmitting(JobKey const& job, std::string const& uploadFolder,
                               std::string const& identity, long long now) {
    return told(job.packId,
                database_.change("UPDATE jobs SET state = $1, problem = '', upload_folder = $2, "
                                 "upload_identity = $3, changed_at = $4, submit_fence = fence WHERE "
                                 "pack = $5 AND state = $6 AND fence = coalesce(CAST($7 AS BIGINT), fence)",
                                 stateName(JobState::Submitting), uploadFolder, identity, now, job.packId,
                                 stateName(JobState::Queued), job.fence));
}

bool JobStore::changeAtRest(std::string const& assignments, std::string const& packId, long long now) {
    return told(packId, database_.change("UPDATE jobs SET problem = '', " + assignments +
                                             " WHERE pack = $1 AND letters_state = '' AND "
                                             "state IN ('accepted', 'held', 'queued')",
                                         packId, now));
}

bool JobStore::hold(std::string const& packId, long long now) {
    return changeAtRest("to_hold = 1, due = NULL, "
                        "changed_at = CASE WHEN state = 'queued' THEN $2 ELSE changed_at END, "
                        "state = CASE WHEN state = 'queued' THEN 'held' ELSE state END",
                        packId, now);
}

bool JobStore::release(std::string const& packId, long long now) {
    return changeAtRest("to_hold = 0, due = NULL, "
                        "changed_at = CASE WHEN state = 'held' THEN $2 ELSE changed_at END, "
                        "state = CASE WHEN state = 'held' THEN 'queued' ELSE state END",
                        packId, now);
}

bool JobStore::cancel(std::string const& packId, long long now) {
    return changeAtRest("due = NULL, changed_at = $2, state = 'cancelled'", packId, now);
}

bool JobStore::wantUpload(std::string const& packId) {
    return database_.change("UPDATE jobs SET to_upload = 1 WHERE pack = $1 AND state IN "
                            "('accepted', 'held', 'queued')",
                            packId) == 1;
}

void JobStore::fail(JobKey const& job, std::string const& reason, long long now) {
    told(job.packId, database_.change("UPDATE jobs SET state = $1, problem = $2, changed_at = $3 "
                                      "WHERE pack = $4 AND fence = coalesce(CAST($5 AS BIGINT), fence)",
                                      stateName(JobState::Failed), reason, now, job.packId, job.fence));
}

bool JobStore::divide(JobKey const& job, LettersByCarriers byCarriers, long long now) {
    JobState const state = byCarriers == LettersByCarriers::All ? JobState::Delivering : JobState::Queued;
    return told(job.packId,
                database_.change("UPDATE jobs SET problem = '', divided = 1, state = $1, letters_state = $2, "
                                 "changed_at = CASE WHEN state = $1 THEN changed_at ELSE $3 END "
                                 "WHERE pack = $4 AND state = $5 AND divided = 0 AND "
                                 "fence = coalesce(CAST($6 AS BIGINT), fence)",
                                 stateName(state),
                                 byCarriers == LettersByCarriers::Some ? stateName(JobState::Delivering) : "",
                                 now, job.packId, stateName(JobState::Queued), job.fence));
}

void JobStore::setLettersState(std::string const& packId, JobState state, std::string const& problem,
                               long long now) {
    told(packId, database_.change("UPDATE jobs SET changed_at = CASE WHEN letters_state <> '' OR state = $1 "
                                  "THEN changed_at ELSE $3 END, "
                                  "state = CASE WHEN letters_state = '' THEN $1 ELSE state END, "
                                  "problem = CASE WHEN letters_state = '' THEN $2 ELSE problem END, "
                                  "letters_problem = CASE WHEN letters_state = '' THEN '' ELSE $2 END, "
                                  "letters_state = CASE WHEN letters_state = '' THEN '' ELSE $1 END "
                                  "WHERE pack = $4 AND divided = 1",
                                  stateName(state), problem, now, packId));
}

std::vector<std::string> JobStore::delivering() const {
    Database::Rows rows = database_.query("SELECT pack FROM jobs WHERE state = 'delivering' UNION ALL "
                                          "SELECT pack FROM jobs WHERE letters_state = 'delivering'");
    std::vector<std::string> packIds;
    while (rows.next())
        packIds.push_back(rows.text(0));
    return packIds;
}

void JobStore::setProblem(JobKey const& job, std::string const& problem) {
    told(job.packId, database_.change("UPDATE jobs SET problem = $1 WHERE pack = $2 AND "
                                      "fence = coalesce(CAST($3 AS BIGINT), fence)",
                                      problem, job.packId, job.fence));
}

void JobStore::wantUpload(std::string const& folder, std::string const& database) {
    Conditions wanted;
    wanted.addEqual("db_folder", folder, true);
    wanted.addEqual("db_name", database, true);
    database_.changeAll("UPDATE jobs SET to_upload = 1 " + wanted.text() +
                            (wanted.text().empty() ? "WHERE " : "AND ") +
                            "state IN ('accepted', 'held', 'queued')",
                        wanted.values());
}

void JobStore::freeAll() {
    database_.change("UPDATE jobs SET holder = '', try_at = 0");
    database_.change("UPDATE carriers SET holder = '', held_until = 0");
}

void JobStore::doubt(std::string const& packId, std::string const& problem, long long now) {
    told(packId, database_.change("UPDATE jobs SET to_hold = 1, due = NULL, problem = $1, changed_at = $2, "
                                  "state = CASE WHEN letters_state = '' THEN 'held' ELSE 'failed' END "
                                  "WHERE pack = $3",
                                  problem, now, packId));
}

void JobStore::recogniseSubmitted(std::string const& packId, std::string const& uploadFolder,
                                  std::string const& identity, long long now) {
    told(packId, database_.change("UPDATE jobs SET state = 'submitted', problem = '', to_upload = 1, "
                                  "to_hold = 0, due = NULL, upload_folder = $1, upload_identity = $2, "
                                  "changed_at = $3 WHERE pack = $4",
                                  uploadFolder, identity, now, packId));
}

// A job is accepted before it ends, so that the index on states bounds the search.
std::vector<Job> JobStore::endedBefore(long long time, std::size_t limit) const {
    std::vector<Job> ended;
    for (JobState const state : Protocol::ALL_JOB_STATES) {
        if (!hasEnded(state) || ended.size() >= limit)
            continue;
        std::vector<Job> jobs =
            jobsIn(database_.query(SELECT_JOBS +
                                       "WHERE state = $1 AND accepted_at < $2 AND changed_at < $2 "
                                       "AND letters_state <> 'delivering' ORDER BY accepted_at, pack LIMIT " +
                                       std::to_string(limit - ended.size()),
                                   stateName(state), time));
        std::ranges::move(jobs, std::back_inserter(ended));
    }
    return ended;
}

void JobStore::forget(std::string const& packId) {
    database_.change("DELETE FROM jobs WHERE pack = $1", packId);
}

void JobStore::emptyLog() { database_.emptyLog(); }

bool JobStore::told(std::string const& packId, long long changedRows) {
    if (changedRows > 0 && untold_)
        untold_->push_back(packId);
    else if (changedRows > 0 && tell_)
        tell_(packId);
    return changedRows > 0;
}

void JobStore::together(std::function<void()> const& steps) {
    untold_.emplace();
    try {
        Database::Transaction transaction(database_);
        steps();
        transaction.commit();
    } catch (...) {
        untold_.reset();
        throw;
    }
    std::vector<std::string> const changed = *std::exchange(untold_, std::nullopt);
    for (std::string const& packId : changed)
        told(packId, 1);
}

std::vector<std::pair<JobState, long long>> JobStore::counts() const {
    Database::Rows rows = database_.query("SELECT state, count(*) FROM jobs GROUP BY state");
    std::vector<std::pair<JobState, long long>> counts;
    while (rows.next())
        counts.emplace_back(stateNamed(rows.text(0)), rows.number(1));
    return counts;
}

std::optional<long long> JobStore::oldestAcceptance(JobState state) const {
    Database::Rows rows = database_.query(
        "SELECT accepted_at FROM jobs WHERE state = $1 ORDER BY accepted_at, pack LIMIT 1", stateName(state));
    return rows.next() ? std::optional(rows.number(0)) : std::nullopt;
}

} // namespace VlServiced
