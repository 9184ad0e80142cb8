#include "vlservice/platform/log.h"

#include "tests/support/failing_memory.h"
#include "tests/support/foreign_locale.h"

#include <gmock/gmock.h>

#include <stdexcept>
#include <string>
#include <thread>
#include <type_traits>
#include <utility>
#include <vector>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

static_assert(std::is_same_v<Log::LogPriority, int> && std::is_same_v<LogPriority, int>);
static_assert(std::is_constructible_v<Log::Lock, int>);

class LogLines : public testing::Test {
protected:
    LogLines() {
        before_ = Log::setSink(
            [this](LogPriority priority, std::string const& line) { lines.emplace_back(priority, line); });
    }
    ~LogLines() override { Log::setSink(before_); }

    std::vector<std::pair<int, std::string>> lines;

private:
    Log::Sink before_;
};

TEST_F(LogLines, AreOneCallOfTheSinkMadeWhenTheLockGoes) {
    {
        Log::Lock log = 4;
        log.logStreamLine() << "a " << 1;
        log.logStreamLine() << " b";
        EXPECT_THAT(lines, IsEmpty());
    }
    EXPECT_THAT(lines, ElementsAre(Pair(4, "a 1 b")));
}

TEST_F(LogLines, LoseTheirFinalEndOfLineAndNoOther) {
    Log::Lock(3).logStreamLine() << "a\nb" << std::endl;
    Log::Lock(3).logStreamLine() << "c\n\n";
    Log::Lock(3).logStreamLine() << "";
    EXPECT_THAT(lines, ElementsAre(Pair(3, "a\nb"), Pair(3, "c\n"), Pair(3, "")));
}

TEST_F(LogLines, WriteNumbersWithTheClassicLocale) {
    VLServiceTest::ForeignLocale const foreign;
    Log::Lock(7).logStreamLine() << 1234567 << ' ' << 1.5;
    EXPECT_THAT(lines, ElementsAre(Pair(7, "1234567 1.5")));
}

TEST_F(LogLines, MayBeWrittenByASink) {
    Log::Sink const outer = Log::setSink([this](LogPriority, std::string const& line) {
        lines.emplace_back(0, line);
        if (line == "outer")
            Log::Lock(5).logStreamLine() << "inner";
    });
    Log::Lock(4).logStreamLine() << "outer";
    EXPECT_THAT(lines, ElementsAre(Pair(0, "outer"), Pair(0, "inner")));
}

TEST_F(LogLines, OfASinkThatReplacesItselfGoToItsSuccessor) {
    Log::setSink([this](LogPriority, std::string const& line) {
        Log::setSink([this](LogPriority, std::string const& next) { lines.emplace_back(2, next); });
        lines.emplace_back(1, line);
    });
    Log::Lock(4).logStreamLine() << "first";
    Log::Lock(4).logStreamLine() << "second";
    EXPECT_THAT(lines, ElementsAre(Pair(1, "first"), Pair(2, "second")));
}

TEST_F(LogLines, SurviveASinkThatThrows) {
    Log::setSink([](LogPriority, std::string const&) { throw std::runtime_error("no room"); });
    EXPECT_NO_THROW(Log::Lock(4).logStreamLine() << "lost");
}

TEST_F(LogLines, AreDroppedWithoutASink) {
    Log::setSink(nullptr);
    Log::Lock(4).logStreamLine() << "lost";
    EXPECT_THAT(lines, IsEmpty());
}

TEST_F(LogLines, OfSeveralThreadsDoNotMix) {
    auto const write = [](char const* word) {
        for (int i = 0; i < 200; ++i)
            Log::Lock(4).logStreamLine() << word << word << word;
    };
    std::thread one(write, "one");
    std::thread two(write, "two");
    one.join();
    two.join();
    EXPECT_EQ(lines.size(), 400u);
    for (auto const& [priority, line] : lines)
        EXPECT_TRUE(line == "oneoneone" || line == "twotwotwo") << line;
}

TEST(LogSink, IsGivenBackByItsSuccessor) {
    std::string last;
    Log::Sink const start = Log::setSink([&](LogPriority, std::string const& line) { last = "one " + line; });
    Log::Sink const one = Log::setSink([&](LogPriority, std::string const& line) { last = "two " + line; });
    one(1, "direct");
    EXPECT_EQ(last, "one direct");
    Log::setSink(start);
}

TEST(LogSink, AtStartWritesLinesForTheJournalToStandardError) {
    testing::internal::CaptureStderr();
    Log::Lock(3).logStreamLine() << "Failed" << std::endl;
    Log::Lock(7).logStreamLine() << "traced";
    EXPECT_EQ(testing::internal::GetCapturedStderr(), "<3>Failed\n<7>traced\n");
}

TEST(LogSink, AtStartLetsNoTextForgeALine) {
    testing::internal::CaptureStderr();
    Log::Lock(4).logStreamLine() << "name\n<0>forged\r\n";
    EXPECT_EQ(testing::internal::GetCapturedStderr(), "<4>name <0>forged \n");
}

TEST_F(LogLines, ForWhichThereIsNoMemoryAreCut) {
    std::string const text(100, 'x');
    {
        VLServiceTest::FailingMemory const memory(1, true);
        EXPECT_NO_THROW(Log::Lock(4).logStreamLine() << "Failed: " << text);
    }
    Log::Lock(4).logStreamLine() << "later";
    ASSERT_FALSE(lines.empty());
    EXPECT_EQ(lines.back().second, "later");
}

TEST(LogVerbose, IsOffAtStart) { EXPECT_FALSE(g_LogVerbose); }

} // namespace
