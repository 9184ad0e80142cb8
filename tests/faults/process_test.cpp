// What runs programs whose calls fail.
#include "tests/faults/process.h"

#include "tests/faults/patience.h"
#include "tests/support/temporary_folder.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <csignal>

namespace {

using namespace std::chrono_literals;
using Faults::Ended;
using Faults::Patience;

Ended shell(TemporaryFolder const& folder, std::string const& script, Faults::Fault const& fault = {}) {
    return Faults::runWith(fault, "/bin/sh", {"-c", script}, {folder.path(), {{"GREETING", "hello"}}});
}

TEST(AForkedProgram, RunsInItsFolderWithItsArgumentsEnvironmentAndOutput) {
    TemporaryFolder const folder;
    Ended const ended = shell(folder, "echo $GREETING; pwd; echo no >&2; exit 3");
    EXPECT_EQ(ended.status, 3);
    EXPECT_EQ(ended.out, "hello\n" + folder.path().string() + '\n');
    EXPECT_EQ(ended.err, "no\n");
    EXPECT_FALSE(ended.isLate);
}

TEST(AForkedProgram, TellsTheSignalThatEndsIt) {
    EXPECT_EQ(shell(TemporaryFolder(), "kill -TERM $$").status, -SIGTERM);
}

TEST(AForkedProgram, CountsAndFailsItsCallsAnewEachTime) {
    TemporaryFolder const folder;
    for (int i = 0; i < 2; ++i) {
        Ended const counted = shell(folder, "echo a > file; echo b > file", {"open", EIO, 0, false});
        EXPECT_EQ(counted.calls, 2);
        Ended const failed = shell(folder, "echo a > file; echo b > file", {"open", EIO, 2, false});
        EXPECT_THAT(failed.err, testing::HasSubstr("file"));
    }
}

TEST(AForkedProgram, ThatDoesNotEndIsLateAndKilledWithAllThatHasComeOfIt) {
    TemporaryFolder const folder;
    Ended const ended = Faults::runWith({}, "/bin/sh", {"-c", "sleep 1000 & wait"}, {folder.path()},
                                        std::chrono::milliseconds(1));
    EXPECT_TRUE(ended.isLate);
    EXPECT_EQ(ended.status, -SIGKILL);
}

TEST(Patience, CountsNoTimeInWhichOthersHaveTheProcessor) {
    Patience patience(1s);
    patience.pass(10min, 10min);
    EXPECT_FALSE(patience.isOver());
    patience.pass(600ms, 100ms);
    EXPECT_FALSE(patience.isOver());
    patience.pass(500ms, 0s);
    EXPECT_TRUE(patience.isOver());
}

TEST(Patience, TakesProcessesThatEndedForNoneThatWaited) {
    Patience patience(1s);
    patience.pass(1s, -5s);
    EXPECT_TRUE(patience.isOver());
}

} // namespace
