// Measures what a question for one job costs among 1,000 to 100,000 jobs, and a look for those that are held
// and due. Decides whether clients may wait for their jobs at the service, and how many jobs may wait for
// their time. What counts is the ratio between the sizes, which has to stay below 2.
#include "programs/database/sqlite_connection.h"
#include "programs/vlserviced/store/job_store.h"
#include "programs/vlserviced/store/schema.h"

#include <benchmark/benchmark.h>

#include <string>

namespace {

using VlServiced::Job;
using VlServiced::JobFilter;
using VlServiced::JobStore;

/// A database in memory with that many jobs.
struct Jobs {
    explicit Jobs(long long count, long long firstDue = 0) {
        Database::Transaction transaction(database);
        for (long long i = 0; i < count; ++i) {
            Job job;
            job.pack = {"/srv/packs", "packs.db", "job " + std::to_string(i)};
            job.title = "Bills of March";
            job.acceptedAt = i / 7;
            job.due = firstDue == 0 ? 0 : firstDue + i;
            store.accept(job);
            if (firstDue != 0)
                store.advance(job.pack.packId, VlServiced::JobState::Accepted, VlServiced::JobState::Held, i);
        }
        transaction.commit();
    }

    Database::SqliteConnection database{
        Database::openDatabase(":memory:", VlServiced::serviceDatabase(), Database::Journal::Rollback)};
    JobStore store{database};
};

void ask(benchmark::State& state, JobFilter const& filter) {
    Jobs const jobs(state.range(0));
    for (auto _ : state)
        benchmark::DoNotOptimize(jobs.store.matching(filter, 1000));
}

void askForOneJob(benchmark::State& state) { ask(state, {"", "", {"job 500"}}); }
void askForTheYoungestOfADatabase(benchmark::State& state) { ask(state, {"/srv/packs", "packs.db", {}}); }

constexpr long long FIRST_DUE = 1'000'000;

/// Ten are due.
void lookForWhatIsDue(benchmark::State& state) {
    Jobs const jobs(state.range(0), FIRST_DUE);
    for (auto _ : state)
        benchmark::DoNotOptimize(jobs.store.due(FIRST_DUE + 9, 100));
}
void lookForTheNextTime(benchmark::State& state) {
    Jobs const jobs(state.range(0), FIRST_DUE);
    for (auto _ : state)
        benchmark::DoNotOptimize(jobs.store.nextDue());
}
/// As it is done every minute and every few hours.
void lookForWhatGoesOn(benchmark::State& state) {
    Jobs const jobs(state.range(0), FIRST_DUE);
    for (auto _ : state)
        benchmark::DoNotOptimize(jobs.store.underWay("", ""));
}

BENCHMARK(lookForWhatIsDue)->Arg(1'000)->Arg(100'000)->Unit(benchmark::kMicrosecond);
BENCHMARK(lookForTheNextTime)->Arg(1'000)->Arg(100'000)->Unit(benchmark::kMicrosecond);
BENCHMARK(lookForWhatGoesOn)->Arg(1'000)->Arg(100'000)->Unit(benchmark::kMicrosecond);
BENCHMARK(askForOneJob)->Arg(1'000)->Arg(10'000)->Arg(100'000)->Unit(benchmark::kMicrosecond);
BENCHMARK(askForTheYoungestOfADatabase)->Arg(1'000)->Arg(10'000)->Arg(100'000)->Unit(benchmark::kMicrosecond);

} // namespace

BENCHMARK_MAIN();
