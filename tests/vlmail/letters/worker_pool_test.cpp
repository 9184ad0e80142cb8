#include "programs/vlmail/letters/worker_pool.h"

#include <gtest/gtest.h>

#include <csignal>
#include <string>
#include <unistd.h>
#include <vector>

namespace {

std::string squareOf(std::size_t index) { return std::to_string(index * index); }

std::vector<std::string> run(std::size_t count, std::size_t workers, VlMail::Job const& job) {
    std::vector<std::string> results;
    VlMail::runJobs(count, workers, job, [&](std::size_t index, std::optional<std::string> result) {
        EXPECT_EQ(index, results.size());
        results.push_back(result.value_or("died"));
    });
    return results;
}

TEST(WorkerPool, GivesTheSameResultsInTheSameOrderOnAnyNumberOfWorkers) {
    auto const alone = run(200, 1, squareOf);
    ASSERT_EQ(alone.size(), 200u);
    EXPECT_EQ(alone[199], "39601");
    EXPECT_EQ(run(200, 2, squareOf), alone);
    EXPECT_EQ(run(200, 7, squareOf), alone);
}

TEST(WorkerPool, StartsNoMoreWorkersThanJobs) {
    EXPECT_EQ(run(1, 64, squareOf), std::vector<std::string>{"0"});
}

TEST(WorkerPool, DoesNothingWithoutJobs) { EXPECT_TRUE(run(0, 2, squareOf).empty()); }

TEST(WorkerPool, PassesEmptyAndLargeResults) {
    auto const results =
        run(3, 2, [](std::size_t index) { return std::string(index == 1 ? 5'000'000 : 0, 'x'); });
    EXPECT_EQ(results[0], "");
    EXPECT_EQ(results[1], std::string(5'000'000, 'x'));
}

TEST(WorkerPool, LosesOnlyTheJobThatKillsItsWorker) {
    auto const results = run(6, 2, [](std::size_t index) {
        if (index == 2)
            ::raise(SIGKILL);
        return squareOf(index);
    });
    EXPECT_EQ(results, (std::vector<std::string>{"0", "1", "died", "9", "16", "25"}));
}

TEST(WorkerPool, CountsWhatIsDone) {
    std::vector<std::size_t> done;
    VlMail::runJobs(
        3, 2, squareOf, [](std::size_t, std::optional<std::string>) {},
        [&](std::size_t count) { done.push_back(count); });
    EXPECT_EQ(done, (std::vector<std::size_t>{1, 2, 3}));
}

TEST(WorkerPool, PassesAFailureOfTheConsumerOn) {
    EXPECT_THROW(VlMail::runJobs(4, 2, squareOf,
                                 [](std::size_t index, std::optional<std::string>) {
                                     if (index == 1)
                                         throw std::runtime_error("no more");
                                 }),
                 std::runtime_error);
}

} // namespace
