// Measures what a question for one job costs among 1,000 to 100,000 jobs. Decides whether clients may wait
// for their jobs at the service. What counts is the ratio between the sizes, which has to stay below 2.
#include "programs/vlserviced/store/job_store.h"
#include "programs/vlserviced/store/schema.h"

#include <SQLiteCpp/Transaction.h>
#include <benchmark/benchmark.h>

#include <string>

namespace {

using VlServiced::Job;
using VlServiced::JobFilter;
using VlServiced::JobStore;

/// A database in memory with that many jobs.
struct Jobs {
    explicit Jobs(long long count) {
        SQLite::Transaction transaction(database);
        for (long long i = 0; i < count; ++i) {
            Job job;
            job.pack = {"/srv/packs", "packs.db", "job " + std::to_string(i)};
            job.title = "Bills of March";
            job.acceptedAt = i / 7;
            store.accept(job);
        }
        transaction.commit();
    }

    SQLite::Database database{
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

BENCHMARK(askForOneJob)->Arg(1'000)->Arg(10'000)->Arg(100'000)->Unit(benchmark::kMicrosecond);
BENCHMARK(askForTheYoungestOfADatabase)->Arg(1'000)->Arg(10'000)->Arg(100'000)->Unit(benchmark::kMicrosecond);

} // namespace

BENCHMARK_MAIN();
