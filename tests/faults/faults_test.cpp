// Each command of vlmail, and vlserviced with one job, while their calls fail, one after the other.
// scripts/torture goes through all of them.
#include "tests/faults/one_job.h"
#include "tests/faults/scenario.h"

#include <gmock/gmock.h>

#include <algorithm>

namespace {

using namespace Faults;

/// So many of the calls that are made often are tried, at even distances; of the others every one.
constexpr long MAX_POINTS = 100;
constexpr long MAX_POINTS_OF_OFTEN = 16;
constexpr long MAX_POINTS_OF_SERVICE = 12;

std::vector<long> pointsOf(std::string const& call, long calls) {
    bool const isOften = call == "read" || call == "open";
    long const count = std::min(calls, isOften ? MAX_POINTS_OF_OFTEN : MAX_POINTS);
    std::vector<long> points;
    for (long i = 0; i < count; ++i)
        points.push_back(1 + i * calls / count);
    return points;
}

/// Left to the sweep: lack of memory, since `mail` and `pack salvage` still end by a signal where it stays
/// out, and the report, which tells other things where a picture fails.
std::vector<Command> quickCommands() {
    std::vector<Command> quick = commands();
    std::erase_if(quick, [](Command const& command) { return command.name == "letter_report"; });
    return quick;
}

bool isQuick(std::string const& call) { return call != "memory"; }

class CommandsWhoseCallsFail : public testing::TestWithParam<Command> {};

TEST_P(CommandsWhoseCallsFail, KeepTheirPromises) {
    Scenario scenario(GetParam());
    long tried = 0;
    for (std::string const& call : CALLS) {
        if (!isQuick(call))
            continue;
        std::vector<Fault> const faults = faultsOf(call);
        for (long const point : pointsOf(call, scenario.callsOf(call))) {
            Fault fault = faults[static_cast<std::size_t>(tried++) % faults.size()];
            fault.number = point;
            EXPECT_THAT(scenario.run(fault), testing::IsEmpty())
                << "to repeat: scripts/torture --repeat " << GetParam().name << ' ' << fault.text();
        }
    }
    // Every command opens and reads something at least.
    EXPECT_GT(tried, 3);
}

INSTANTIATE_TEST_SUITE_P(OfVlMail, CommandsWhoseCallsFail, testing::ValuesIn(quickCommands()),
                         [](auto const& each) { return each.param.name; });

class AServiceWhoseCallsFail : public testing::TestWithParam<std::string> {};

TEST_P(AServiceWhoseCallsFail, LosesNothingAndDoublesNothing) {
    OneJob job;
    std::vector<Fault> const faults = faultsOf(GetParam());
    long const calls = job.callsOf(GetParam());
    EXPECT_GT(calls, 0);
    for (long i = 0; i < std::min(calls, MAX_POINTS_OF_SERVICE); ++i) {
        Fault fault = faults[static_cast<std::size_t>(i) % faults.size()];
        fault.number = 1 + i * calls / std::min(calls, MAX_POINTS_OF_SERVICE);
        EXPECT_THAT(job.run(fault), testing::IsEmpty())
            << "to repeat: scripts/torture --repeat service " << fault.text();
    }
}

INSTANTIATE_TEST_SUITE_P(OfAKind, AServiceWhoseCallsFail,
                         testing::Values("write", "sync", "rename", "remove", "open", "read"),
                         [](auto const& each) { return each.param; });

} // namespace
