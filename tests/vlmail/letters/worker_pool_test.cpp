#include "programs/vlmail/letters/worker_pool.h"

#include <gtest/gtest.h>

#include <chrono>
#include <csignal>
#include <ctime>
#include <new>
#include <string>
#include <unistd.h>
#include <vector>

namespace {

std::string squareOf(std::size_t index) { return std::to_string(index * index); }

std::string inWords(VlMail::JobResult const& result) {
    if (auto const* const bytes = std::get_if<std::string>(&result))
        return *bytes;
    switch (std::get<VlMail::JobFailure>(result)) {
    case VlMail::JobFailure::Died:
        return "died";
    case VlMail::JobFailure::OutOfTime:
        return "out of time";
    case VlMail::JobFailure::NoMemory:
        return "no memory";
    case VlMail::JobFailure::OutOfMemory:
        break;
    }
    return "out of memory";
}

std::vector<std::string> run(std::size_t count, std::size_t workers, VlMail::Job const& job,
                             VlMail::JobLimits const& limits = {}) {
    std::vector<std::string> results;
    VlMail::runJobs(count, {workers, limits}, job, [&](std::size_t index, VlMail::JobResult result) {
        EXPECT_EQ(index, results.size());
        results.push_back(inWords(result));
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

TEST(WorkerPool, SaysWhichJobTheMachineHadNoMemoryFor) {
    auto const results = run(4, 2, [](std::size_t index) {
        if (index == 1)
            throw std::bad_alloc();
        return squareOf(index);
    });
    EXPECT_EQ(results, (std::vector<std::string>{"0", "no memory", "4", "9"}));
}

TEST(WorkerPool, EndsAJobThatTakesMoreTimeThanItMay) {
    auto const results = run(4, 2,
                             [](std::size_t index) {
                                 for (volatile bool forever = index == 1; forever;) {
                                 }
                                 return squareOf(index);
                             },
                             {.processor = std::chrono::milliseconds(100)});
    EXPECT_EQ(results, (std::vector<std::string>{"0", "out of time", "4", "9"}));
}

TEST(WorkerPool, EndsAJobThatTakesMoreMemoryThanItMay) {
    auto const results = run(4, 2,
                             [](std::size_t index) {
                                 std::vector<std::string> taken;
                                 while (index == 2)
                                     taken.emplace_back(1 << 20, 'x');
                                 return squareOf(index);
                             },
                             {.memory = std::uint64_t{64} << 20});
    EXPECT_EQ(results, (std::vector<std::string>{"0", "1", "out of memory", "9"}));
}

TEST(WorkerPool, CountsEachJobForItself) {
    auto const results = run(5, 1,
                             [](std::size_t index) {
                                 std::clock_t const end = std::clock() + CLOCKS_PER_SEC / 20;
                                 while (std::clock() < end) {
                                 }
                                 return squareOf(index);
                             },
                             {.processor = std::chrono::milliseconds(150)});
    EXPECT_EQ(results, (std::vector<std::string>{"0", "1", "4", "9", "16"}));
}

TEST(WorkerPool, CountsWhatIsDone) {
    std::vector<std::size_t> done;
    VlMail::runJobs(
        3, {2}, squareOf, [](std::size_t, VlMail::JobResult) {},
        [&](std::size_t count) { done.push_back(count); });
    EXPECT_EQ(done, (std::vector<std::size_t>{1, 2, 3}));
}

TEST(WorkerPool, PassesAFailureOfTheConsumerOn) {
    EXPECT_THROW(VlMail::runJobs(4, {2}, squareOf,
                                 [](std::size_t index, VlMail::JobResult) {
                                     if (index == 1)
                                         throw std::runtime_error("no more");
                                 }),
                 std::runtime_error);
}

} // namespace
