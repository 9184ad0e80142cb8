// Measures on PostgreSQL how many jobs a second up to 1,000 services claim, work on and finish, sixteen at a
// time, over as many connections as a pool in front of the database would hold; and what a look costs that
// finds nothing, which each service makes four times a lease and every 15 seconds. Decides how many services
// may share a database. What counts are the ratios: jobs a second of four connections to one, and a look
// among 100,000 jobs that have ended to one among none.
#include "programs/database/postgres_connection.h"
#include "programs/vlserviced/store/job_store.h"
#include "programs/vlserviced/store/schema.h"
#include "tests/support/postgres_server.h"

#include <benchmark/benchmark.h>

#include <cstddef>
#include <memory>
#include <string>
#include <thread>
#include <vector>

namespace {

using VlServiced::Holder;
using VlServiced::Job;
using VlServiced::JobState;
using VlServiced::JobStore;

constexpr std::size_t SERVICES = 1000;
constexpr std::size_t AT_ONCE = 16;
constexpr long long JOBS = 8000;

/// Synced, as it is with people's letters.
VLServiceTest::PostgresServer const& server() {
    static VLServiceTest::PostgresServer const server({"fsync=on"});
    return server;
}

/// Those that wait have ids of their own.
void addJobs(Database::Connection& database, std::string const& state, long long count) {
    database.run("INSERT INTO jobs (pack, db_folder, db_name, cfg_id, title, documents, pages, state, "
                 "to_upload, accepted_at, changed_at, try_at) SELECT '" +
                 state + "-' || i, 'channel', 'packs', 'a=acme', 'Bills', 1, 2, '" + state +
                 "', 1, 1, 1, 0 FROM generate_series(1, " + std::to_string(count) + ") AS i");
    database.run("ANALYZE jobs");
}

/// Services that share one connection, each in its turn, until nothing is left to claim.
void finishAll(std::string const& address, std::size_t first, std::size_t step) {
    Database::PostgresConnection database(address);
    for (std::size_t service = first;; service = (service + step) % SERVICES) {
        JobStore jobs(database, Holder{"service " + std::to_string(service), 60});
        std::vector<Job> const claimed = jobs.claim(AT_ONCE);
        if (claimed.empty())
            return;
        jobs.together([&] {
            for (Job const& job : claimed)
                jobs.advance({job.pack.packId, job.fence}, JobState::Queued, JobState::Submitted, 2);
        });
    }
}

void claimAndFinish(benchmark::State& state) {
    auto const connections = static_cast<std::size_t>(state.range(0));
    for (auto _ : state) {
        state.PauseTiming();
        VLServiceTest::PostgresDatabase const made(server().folder());
        addJobs(*VlServiced::openSharedDatabase(made.address()).connection, "queued", JOBS);
        state.ResumeTiming();
        std::vector<std::thread> threads;
        for (std::size_t i = 0; i < connections; ++i)
            threads.emplace_back([&, i] { finishAll(made.address(), i, connections); });
        for (std::thread& thread : threads)
            thread.join();
    }
    state.SetItemsProcessed(state.iterations() * JOBS);
}

void lookAndFindNothing(benchmark::State& state) {
    VLServiceTest::PostgresDatabase const made(server().folder());
    auto const database = VlServiced::openSharedDatabase(made.address()).connection;
    addJobs(*database, "submitted", state.range(0));
    JobStore jobs(*database);
    for (auto _ : state)
        benchmark::DoNotOptimize(jobs.claim(AT_ONCE));
}

BENCHMARK(claimAndFinish)->Arg(1)->Arg(4)->Arg(16)->UseRealTime()->Unit(benchmark::kMillisecond);
BENCHMARK(lookAndFindNothing)->Arg(1)->Arg(100'000)->UseRealTime()->Unit(benchmark::kMicrosecond);

} // namespace

BENCHMARK_MAIN();
