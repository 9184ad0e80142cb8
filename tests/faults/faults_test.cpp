// Each command of vlmail, and vlserviced with one job, while their calls fail, one after the other.
// scripts/torture goes through all of them.
#include "tests/faults/one_job.h"
#include "tests/faults/scenario.h"
#include "tests/faults/served_command.h"
#include "tests/support/sanitized.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <cerrno>

namespace {

using namespace Faults;

/// Every call is tried up to so many; of more, so many at even distances.
constexpr long MAX_POINTS = 100;
/// Of those that there are hundreds or tens of thousands of, and that differ less.
constexpr long MAX_POINTS_OF_OFTEN = 16;
constexpr long MAX_POINTS_OF_SERVICE = 12;

/// Of each kind of call; the command that waits for a job takes the longest.
long maxPointsOfServed(std::string const& command) { return command == "mail_send" ? 8 : 40; }

/// One command in which no allocation of its beginning, which all commands share, is left out.
constexpr char const* LIGHTEST = "pack_list";

std::vector<long> pointsOf(long calls, long limit) {
    long const count = std::min(calls, limit);
    std::vector<long> points;
    for (long i = 0; i < count; ++i)
        points.push_back(1 + i * calls / count);
    return points;
}

bool isOften(std::string const& call) { return call == "memory" || call == "read"; }

class CommandsWhoseCallsFail : public testing::TestWithParam<Command> {};

TEST_P(CommandsWhoseCallsFail, KeepTheirPromises) {
    Scenario scenario(GetParam());
    long tried = 0;
    for (std::string const& call : CALLS) {
        std::vector<Fault> const faults = faultsOf(call);
        for (long const point :
             pointsOf(scenario.callsOf(call), isOften(call) ? MAX_POINTS_OF_OFTEN : MAX_POINTS)) {
            Fault fault = faults[static_cast<std::size_t>(tried++) % faults.size()];
            fault.number = point;
            EXPECT_THAT(scenario.run(fault), testing::IsEmpty())
                << "to repeat: scripts/torture --repeat " << GetParam().name << ' ' << fault.text();
        }
    }
    // Every command opens and reads something at least.
    EXPECT_GT(tried, 3);
}

INSTANTIATE_TEST_SUITE_P(OfVlMail, CommandsWhoseCallsFail, testing::ValuesIn(commands()),
                         [](auto const& each) { return each.param.name; });

TEST(CommandsWithoutMemory, KeepTheirPromisesWhicheverOfTheFirstAllocationsFails) {
    if (VLServiceTest::SANITIZED)
        GTEST_SKIP() << "a sanitizer brings an allocator of its own";
    Scenario scenario(*std::ranges::find(commands(), LIGHTEST, &Command::name));
    std::vector<Fault> const faults = faultsOf("memory");
    for (long point = 1; point <= MAX_POINTS; ++point) {
        Fault fault = faults[static_cast<std::size_t>(point) % faults.size()];
        fault.number = point;
        EXPECT_THAT(scenario.run(fault), testing::IsEmpty()) << fault.text();
    }
}

TEST(ACheckOfAMailing, DoesNotTakeADiskThatFailsForDamage) {
    Scenario scenario(*std::ranges::find(commands(), "pack_verify", &Command::name));
    long const calls = scenario.callsOf("read");
    EXPECT_GT(calls, 3);
    for (long number = 1; number <= calls; ++number) {
        Ended const ended = scenario.look({"read", EIO, number, true});
        bool const isTold = (ended.out + ended.err).find("Input/output error") != std::string::npos;
        EXPECT_EQ(ended.status != 0, isTold) << number << ": " << ended.out << ended.err;
    }
}

class CommandsThatAskAService : public testing::TestWithParam<std::string> {};

TEST_P(CommandsThatAskAService, LoseNothingAndDoubleNothingWhenTheirCallsFail) {
    ServedCommand command(GetParam());
    long tried = 0;
    for (std::string const& call : CALLS) {
        std::vector<Fault> const faults = faultsOf(call);
        for (long const point : pointsOf(command.callsOf(call), maxPointsOfServed(GetParam()))) {
            Fault fault = faults[static_cast<std::size_t>(tried++) % faults.size()];
            fault.number = point;
            EXPECT_THAT(command.run(fault), testing::IsEmpty())
                << "to repeat: scripts/torture --repeat " << GetParam() << ' ' << fault.text();
        }
    }
    EXPECT_GT(tried, 3);
}

INSTANTIATE_TEST_SUITE_P(OfVlMail, CommandsThatAskAService, testing::ValuesIn(ServedCommand::NAMES),
                         [](auto const& each) { return each.param; });

class AServiceWhoseCallsFail : public testing::TestWithParam<std::string> {};

TEST_P(AServiceWhoseCallsFail, LosesNothingAndDoublesNothing) {
    if (VLServiceTest::SANITIZED && GetParam() == "memory")
        GTEST_SKIP() << "a sanitizer brings an allocator of its own";
    OneJob job;
    std::vector<Fault> const faults = faultsOf(GetParam());
    long const calls = job.callsOf(GetParam());
    EXPECT_GT(calls, 0);
    std::size_t tried = 0;
    for (long const point : pointsOf(calls, MAX_POINTS_OF_SERVICE)) {
        Fault fault = faults[tried++ % faults.size()];
        fault.number = point;
        EXPECT_THAT(job.run(fault), testing::IsEmpty())
            << "to repeat: scripts/torture --repeat service " << fault.text();
    }
}

INSTANTIATE_TEST_SUITE_P(OfAKind, AServiceWhoseCallsFail,
                         testing::Values("write", "sync", "rename", "remove", "open", "read", "memory",
                                         "send", "receive"),
                         [](auto const& each) { return each.param; });

} // namespace
