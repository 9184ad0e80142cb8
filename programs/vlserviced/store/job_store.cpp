#include "programs/vlserviced/store/job_store.h"

#include "vlservice/json/json_form.h"
#include "vlservice/json/json_text.h"

#include <SQLiteCpp/Statement.h>

#include <algorithm>
#include <sstream>
#include <utility>

namespace VlServiced {
namespace {

using Protocol::stateName;
using Protocol::stateNamed;

constexpr char const* SELECT_JOBS =
    "SELECT pack, db_folder, db_name, cfg_id, title, documents, pages, state, "
    "problem, to_upload, upload_folder, accepted_at, changed_at, upload_identity, due, to_hold, trial, "
    "divided, letters_state, letters_problem FROM jobs ";

/// The states of which there are few: the others are where jobs rest, or end.
constexpr JobState UNDER_WAY[] = {JobState::Accepted, JobState::Queued, JobState::Submitting,
                                  JobState::Submitted, JobState::Lodged};

Job jobIn(SQLite::Statement& row) {
    Job job;
    job.pack.packId = row.getColumn(0).getString();
    job.pack.folder = row.getColumn(1).getString();
    job.pack.database = row.getColumn(2).getString();
    job.cfgId = row.getColumn(3).getString();
    job.title = row.getColumn(4).getString();
    job.documents = row.getColumn(5).getInt64();
    job.pages = row.getColumn(6).getInt64();
    job.state = stateNamed(row.getColumn(7).getString());
    job.problem = row.getColumn(8).getString();
    job.toUpload = row.getColumn(9).getInt() != 0;
    job.uploadFolder = row.getColumn(10).getString();
    job.acceptedAt = row.getColumn(11).getInt64();
    job.changedAt = row.getColumn(12).getInt64();
    job.uploadFolderIdentity = row.getColumn(13).getString();
    job.due = row.getColumn(14).getInt64();
    job.toHold = row.getColumn(15).getInt() != 0;
    job.isTrial = row.getColumn(16).getInt() != 0;
    job.isDivided = row.getColumn(17).getInt() != 0;
    if (std::string const state = row.getColumn(18).getString(); !state.empty())
        job.lettersState = stateNamed(state);
    job.lettersProblem = row.getColumn(19).getString();
    return job;
}

std::vector<Job> jobsIn(SQLite::Statement& query) {
    std::vector<Job> jobs;
    while (query.executeStep())
        jobs.push_back(jobIn(query));
    return jobs;
}

/// What rows have to fulfil, with the texts that go into it.
class Conditions {
public:
    /// An empty text is no restriction.
    void add(std::string const& before, std::string const& value, std::string const& behind = "") {
        if (value.empty())
            return;
        values_.push_back(value);
        text_ += (text_.empty() ? "WHERE " : "AND ") + before + "(?" + std::to_string(values_.size()) + ")" +
                 behind + ' ';
    }
    std::string const& text() const { return text_; }
    void bind(SQLite::Statement& query) const {
        for (std::size_t i = 0; i < values_.size(); ++i)
            query.bind(static_cast<int>(i) + 1, values_[i]);
    }

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

} // namespace

JobStore::JobStore(SQLite::Database& database) : database_(database) {}

std::optional<Job> JobStore::find(std::string const& packId) const {
    SQLite::Statement query(database_, std::string(SELECT_JOBS) + "WHERE pack = ?");
    query.bindNoCopy(1, packId);
    if (!query.executeStep())
        return std::nullopt;
    return jobIn(query);
}

std::vector<Job> JobStore::inState(JobState state) const {
    SQLite::Statement query(database_,
                            std::string(SELECT_JOBS) + "WHERE state = ? ORDER BY accepted_at, pack");
    query.bind(1, stateName(state));
    return jobsIn(query);
}

std::vector<Job> JobStore::matching(JobFilter const& filter, std::size_t limit) const {
    // Only the conditions that are wanted: one that may hold for every row would keep the indexes out.
    Conditions wanted;
    // Ids say more than all else: the sign keeps the other conditions from choosing the index.
    std::string const sign = filter.packIds.empty() ? "" : "+";
    wanted.add(sign + "db_folder = ", filter.folder);
    wanted.add(sign + "db_name = ", filter.database);
    if (!filter.packIds.empty())
        wanted.add("pack IN (SELECT value FROM json_each", textOf(filter.packIds), ")");
    SQLite::Statement query(database_, SELECT_JOBS + wanted.text() +
                                           "ORDER BY accepted_at DESC, pack DESC LIMIT " +
                                           std::to_string(limit));
    wanted.bind(query);
    std::vector<Job> jobs = jobsIn(query);
    std::reverse(jobs.begin(), jobs.end());
    return jobs;
}

std::vector<Job> JobStore::underWay(std::string const& folder, std::string const& database) const {
    std::vector<std::string> states;
    for (JobState const state : UNDER_WAY)
        states.emplace_back(stateName(state));
    Conditions wanted;
    wanted.add("state IN (SELECT value FROM json_each", textOf(states), ")");
    // The signs keep these from choosing the index: what rests and has ended is of the same databases.
    wanted.add("+db_folder = ", folder);
    wanted.add("+db_name = ", database);
    SQLite::Statement query(database_, SELECT_JOBS + wanted.text() + "ORDER BY accepted_at, pack");
    wanted.bind(query);
    return jobsIn(query);
}

// The state stands in the text: a bound one would keep the index out, which holds that state alone.
std::vector<Job> JobStore::due(long long now, std::size_t limit) const {
    SQLite::Statement query(database_, std::string(SELECT_JOBS) +
                                           "INDEXED BY jobs_by_due WHERE state = 'held' AND due <= ? "
                                           "ORDER BY due, pack LIMIT " +
                                           std::to_string(limit));
    query.bind(1, static_cast<std::int64_t>(now));
    return jobsIn(query);
}

std::optional<long long> JobStore::nextDue() const {
    SQLite::Statement query(database_, "SELECT due FROM jobs INDEXED BY jobs_by_due WHERE state = 'held' AND "
                                       "due IS NOT NULL ORDER BY due LIMIT 1");
    if (!query.executeStep())
        return std::nullopt;
    return query.getColumn(0).getInt64();
}

bool JobStore::accept(Job const& job) {
    SQLite::Statement insertion(
        database_, "INSERT INTO jobs (pack, db_folder, db_name, cfg_id, title, documents, pages, "
                   "state, accepted_at, changed_at, to_upload, due, to_hold, trial) "
                   "VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8, ?9, ?9, ?10, nullif(?11, 0), ?12, ?13) "
                   "ON CONFLICT DO NOTHING");
    insertion.bind(1, job.pack.packId);
    insertion.bind(2, job.pack.folder);
    insertion.bind(3, job.pack.database);
    insertion.bind(4, job.cfgId);
    insertion.bind(5, job.title);
    insertion.bind(6, static_cast<std::int64_t>(job.documents));
    insertion.bind(7, static_cast<std::int64_t>(job.pages));
    insertion.bind(8, stateName(JobState::Accepted));
    insertion.bind(9, static_cast<std::int64_t>(job.acceptedAt));
    insertion.bind(10, job.toUpload ? 1 : 0);
    insertion.bind(11, static_cast<std::int64_t>(job.due));
    insertion.bind(12, job.toHold ? 1 : 0);
    insertion.bind(13, job.isTrial ? 1 : 0);
    return insertion.exec() == 1;
}

bool JobStore::advance(std::string const& packId, JobState from, JobState to, long long now) {
    SQLite::Statement change(database_, "UPDATE jobs SET state = ?, problem = '', changed_at = ? "
                                        "WHERE pack = ? AND state = ?");
    change.bind(1, stateName(to));
    change.bind(2, static_cast<std::int64_t>(now));
    change.bind(3, packId);
    change.bind(4, stateName(from));
    bool const moved = change.exec() == 1;
    if (moved)
        changed(packId);
    return moved;
}

bool JobStore::beginSubmitting(std::string const& packId, std::string const& uploadFolder,
                               std::string const& identity, long long now) {
    SQLite::Statement change(database_, "UPDATE jobs SET state = ?, problem = '', upload_folder = ?, "
                                        "upload_identity = ?, changed_at = ? WHERE pack = ? AND state = ?");
    change.bind(1, stateName(JobState::Submitting));
    change.bind(2, uploadFolder);
    change.bind(3, identity);
    change.bind(4, static_cast<std::int64_t>(now));
    change.bind(5, packId);
    change.bind(6, stateName(JobState::Queued));
    bool const moved = change.exec() == 1;
    if (moved)
        changed(packId);
    return moved;
}

bool JobStore::changeAtRest(std::string const& assignments, std::string const& packId, long long now) {
    SQLite::Statement change(database_, "UPDATE jobs SET problem = '', " + assignments +
                                            " WHERE pack = ?1 AND letters_state = '' AND "
                                            "state IN ('accepted', 'held', 'queued')");
    change.bind(1, packId);
    change.bind(2, static_cast<std::int64_t>(now));
    bool const isChanged = change.exec() == 1;
    if (isChanged)
        changed(packId);
    return isChanged;
}

bool JobStore::hold(std::string const& packId, long long now) {
    return changeAtRest("to_hold = 1, due = NULL, changed_at = iif(state = 'queued', ?2, changed_at), "
                        "state = iif(state = 'queued', 'held', state)",
                        packId, now);
}

bool JobStore::release(std::string const& packId, long long now) {
    return changeAtRest("to_hold = 0, due = NULL, changed_at = iif(state = 'held', ?2, changed_at), "
                        "state = iif(state = 'held', 'queued', state)",
                        packId, now);
}

bool JobStore::cancel(std::string const& packId, long long now) {
    return changeAtRest("due = NULL, changed_at = ?2, state = 'cancelled'", packId, now);
}

bool JobStore::wantUpload(std::string const& packId) {
    SQLite::Statement change(database_, "UPDATE jobs SET to_upload = 1 WHERE pack = ? AND state IN "
                                        "('accepted', 'held', 'queued')");
    change.bind(1, packId);
    return change.exec() == 1;
}

void JobStore::fail(std::string const& packId, std::string const& reason, long long now) {
    SQLite::Statement change(database_,
                             "UPDATE jobs SET state = ?, problem = ?, changed_at = ? WHERE pack = ?");
    change.bind(1, stateName(JobState::Failed));
    change.bind(2, reason);
    change.bind(3, static_cast<std::int64_t>(now));
    change.bind(4, packId);
    change.exec();
    changed(packId);
}

bool JobStore::divide(std::string const& packId, LettersByCarriers byCarriers, long long now) {
    SQLite::Statement change(database_, "UPDATE jobs SET problem = '', divided = 1, state = ?, "
                                        "letters_state = ?, changed_at = iif(state = ?1, changed_at, ?) "
                                        "WHERE pack = ? AND state = ? AND divided = 0");
    bool const isAll = byCarriers == LettersByCarriers::All;
    change.bind(1, stateName(isAll ? JobState::Delivering : JobState::Queued));
    change.bind(2, byCarriers == LettersByCarriers::Some ? stateName(JobState::Delivering) : "");
    change.bind(3, static_cast<std::int64_t>(now));
    change.bind(4, packId);
    change.bind(5, stateName(JobState::Queued));
    bool const isDivided = change.exec() == 1;
    if (isDivided)
        changed(packId);
    return isDivided;
}

void JobStore::setLettersState(std::string const& packId, JobState state, std::string const& problem,
                               long long now) {
    SQLite::Statement change(
        database_, "UPDATE jobs SET "
                   "changed_at = iif(letters_state <> '' OR state = ?1, changed_at, ?3), "
                   "state = iif(letters_state = '', ?1, state), "
                   "problem = iif(letters_state = '', ?2, problem), "
                   "letters_problem = iif(letters_state = '', '', ?2), "
                   "letters_state = iif(letters_state = '', '', ?1) WHERE pack = ?4 AND divided = 1");
    change.bind(1, stateName(state));
    change.bind(2, problem);
    change.bind(3, static_cast<std::int64_t>(now));
    change.bind(4, packId);
    change.exec();
    changed(packId);
}

std::vector<std::string> JobStore::delivering() const {
    SQLite::Statement query(database_, "SELECT pack FROM jobs WHERE state = 'delivering' UNION ALL "
                                       "SELECT pack FROM jobs WHERE letters_state = 'delivering'");
    std::vector<std::string> packIds;
    while (query.executeStep())
        packIds.push_back(query.getColumn(0).getString());
    return packIds;
}

void JobStore::setProblem(std::string const& packId, std::string const& problem) {
    SQLite::Statement change(database_, "UPDATE jobs SET problem = ? WHERE pack = ?");
    change.bind(1, problem);
    change.bind(2, packId);
    change.exec();
    changed(packId);
}

void JobStore::wantUpload(std::string const& folder, std::string const& database) {
    SQLite::Statement change(database_, "UPDATE jobs SET to_upload = 1 WHERE ?1 IN ('', db_folder) AND "
                                        "?2 IN ('', db_name) AND state IN ('accepted', 'held', 'queued')");
    change.bind(1, folder);
    change.bind(2, database);
    change.exec();
}

// A job is accepted before it ends, so that the index on states bounds the search.
std::vector<Job> JobStore::endedBefore(long long time, std::size_t limit) const {
    std::vector<Job> ended;
    for (JobState const state : Protocol::ALL_JOB_STATES) {
        if (!hasEnded(state) || ended.size() >= limit)
            continue;
        SQLite::Statement query(database_, std::string(SELECT_JOBS) +
                                               "WHERE state = ?1 AND accepted_at < ?2 AND changed_at < ?2 "
                                               "AND letters_state <> 'delivering' "
                                               "ORDER BY accepted_at, pack LIMIT " +
                                               std::to_string(limit - ended.size()));
        query.bind(1, stateName(state));
        query.bind(2, static_cast<std::int64_t>(time));
        for (Job& job : jobsIn(query))
            ended.push_back(std::move(job));
    }
    return ended;
}

void JobStore::forget(std::string const& packId) {
    SQLite::Statement deletion(database_, "DELETE FROM jobs WHERE pack = ?");
    deletion.bind(1, packId);
    deletion.exec();
}

void JobStore::emptyLog() { database_.exec("PRAGMA wal_checkpoint(TRUNCATE)"); }

void JobStore::changed(std::string const& packId) const {
    if (tell_)
        tell_(packId);
}

std::vector<std::pair<JobState, long long>> JobStore::counts() const {
    SQLite::Statement query(database_, "SELECT state, count(*) FROM jobs GROUP BY state");
    std::vector<std::pair<JobState, long long>> counts;
    while (query.executeStep())
        counts.emplace_back(stateNamed(query.getColumn(0).getString()), query.getColumn(1).getInt64());
    return counts;
}

} // namespace VlServiced
