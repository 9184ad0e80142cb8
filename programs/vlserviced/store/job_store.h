#pragma once
// Jobs as the database keeps them: one for each pack id, whatever happens to the command that brought it.

#include "programs/database/connection.h"
#include "programs/vlserviced/store/job.h"

#include <functional>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace VlServiced {

/// How many letters of a job go by carriers.
enum class LettersByCarriers { None, Some, All };

/// Which jobs a query is about; an empty text is no restriction.
struct JobFilter {
    std::string folder;
    std::string database;
    std::vector<std::string> packIds;
    /// Those of this node and of all below it.
    std::string node = {};
};

/// A job that is to be changed; with a fence, only while nobody has taken hold of it since.
struct JobKey {
    JobKey(std::string id, std::optional<long long> itsFence = {}) : packId(std::move(id)), fence(itsFence) {}
    JobKey(char const* id) : packId(id) {}

    std::string packId;
    std::optional<long long> fence;
};

/// Under which name a store takes hold of jobs and channels, and for how long.
struct Holder {
    /// Another one for each process that shares a database.
    std::string name = "this service";
    long long seconds = 60;
};

/// Every change is one transaction and on the disk when the operation returns. Several processes may share
/// the database; whoever works on a job takes hold of it for a time, by the database's clock.
class JobStore {
public:
    /// The database has to outlive the store.
    explicit JobStore(Database::Connection& database, Holder holder = {});

    std::optional<Job> find(std::string const& packId) const;
    /// In the order of their acceptance.
    std::vector<Job> inState(JobState state) const;
    /// In the order of their acceptance, at most `limit`, the youngest when there are more. Costs what the
    /// answer is large, however many jobs there are.
    std::vector<Job> matching(JobFilter const& filter, std::size_t limit) const;
    /// Those of a pack database that go on by themselves; empty texts are no restriction. Costs what the
    /// answer is large, however many are held or done.
    std::vector<Job> underWay(std::string const& folder, std::string const& database) const;

    /// Of those that are held and due by then the first few, in the order of their time. Costs what the
    /// answer is large.
    std::vector<Job> due(long long now, std::size_t limit) const;
    /// When the next job that is held is due.
    std::optional<long long> nextDue() const;

    /// How many jobs are in each state that any is in.
    std::vector<std::pair<JobState, long long>> counts() const;
    /// When the oldest job of a state was accepted.
    std::optional<long long> oldestAcceptance(JobState state) const;

    /// Records a new job as accepted. False when there is one of that pack id already: it stays as it is.
    bool accept(Job const& job);
    /// Takes hold of jobs that are to be worked on and that nobody holds, in the order of their time, at most
    /// so many.
    std::vector<Job> claim(std::size_t most);
    /// The same of one job, whenever it was to be tried again.
    std::optional<Job> claim(std::string const& packId);
    /// Holds those on that are held still.
    void keep(std::vector<std::string> const& packIds);
    /// Lets go of a job, which nobody tries before so many seconds are over.
    void letGo(JobKey const& job, long long seconds);
    /// Has all that nobody holds tried at once.
    void hurry();
    /// What an earlier process of the same name was holding is free. Nothing where several may be at work.
    void freeOwn();
    Holder const& holder() const { return holder_; }
    bool isShared() const { return !database_.isSqlite(); }

    /// Moves a job on and clears its problem. The container's way is irreversible, so `from` has to be the
    /// job's state; false, and no change, when it is not.
    bool advance(JobKey const& job, JobState from, JobState to, long long now);
    /// Moves a queued job on to Submitting, into that very folder; false, and no change, when it is not
    /// queued. Its container is staged under the job's fence.
    bool beginSubmitting(JobKey const& job, std::string const& uploadFolder, std::string const& identity,
                         long long now);
    /// Has a job held until it is released, also one that is not queued yet. False, and no change, once it is
    /// on its way.
    bool hold(std::string const& packId, long long now);
    /// Lets a job go on that is held, or will be; false, and no change, when it cannot be held any more.
    bool release(std::string const& packId, long long now);
    /// Calls a job back; false, and no change, once it is on its way.
    bool cancel(std::string const& packId, long long now);
    /// Notes that a queued job's letters were divided: `byCarriers` of them go by carriers, the others in the
    /// container. False, and no change, when the job is not queued or was divided before.
    bool divide(JobKey const& job, LettersByCarriers byCarriers, long long now);
    /// Notes how far the letters of a divided job are that go by carriers; the job's state is theirs when
    /// none is in the container.
    void setLettersState(std::string const& packId, JobState state, std::string const& problem,
                         long long now);
    /// The pack ids of jobs whose letters are on their way, or were when that was noted.
    std::vector<std::string> delivering() const;
    /// Has a job handed on that is not yet; false, and no change, once it is on its way.
    bool wantUpload(std::string const& packId);
    /// Gives a job up for the reason told.
    void fail(JobKey const& job, std::string const& reason, long long now);
    /// Notes what keeps a job where it is.
    void setProblem(JobKey const& job, std::string const& problem);
    /// Marks the jobs of a pack database that are not handed on yet as to be handed on; empty texts are no
    /// restriction.
    void wantUpload(std::string const& folder, std::string const& database);

    // Of a record that was restored, in which others may have gone on with jobs.

    /// Nobody holds any.
    void freeAll();
    /// Holds a job until a person decides, which the problem is about; gives it up where only its letters
    /// can be decided of.
    void doubt(std::string const& packId, std::string const& problem, long long now);
    /// Its container lies in that folder.
    void recogniseSubmitted(std::string const& packId, std::string const& uploadFolder,
                            std::string const& identity, long long now);

    /// Those that ended before that time, a few of them.
    std::vector<Job> endedBefore(long long time, std::size_t limit) const;
    /// Removes what is on record of a job.
    void forget(std::string const& packId);
    /// Writes what the log holds into the database, and empties it: nothing of what was removed stays in it.
    void emptyLog();

    /// Carries steps out as a whole or not at all; of the changes in them is told when they are on record.
    void together(std::function<void()> const& steps);
    /// Has a function called after each change of a job's state or problem, with the pack id.
    void onChange(std::function<void(std::string const&)> tell) { tell_ = std::move(tell); }

private:
    /// Of those of that pack id in a state from which one may go back.
    bool changeAtRest(std::string const& assignments, std::string const& packId, long long now);
    /// Tells of the job when a row has changed, and says whether one has.
    bool told(std::string const& packId, long long changedRows);

    Database::Connection& database_;
    Holder holder_;
    std::function<void(std::string const&)> tell_;
    /// While steps are carried out together: of what is to be told behind them.
    std::optional<std::vector<std::string>> untold_;
};

} // namespace VlServiced
