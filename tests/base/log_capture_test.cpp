#include "programs/base/log_capture.h"

#include <gmock/gmock.h>

namespace {

TEST(LogCapture, KeepsLinesFromTheSinkBefore) {
    std::vector<std::string> outside;
    Log::Sink const before =
        Log::setSink([&](LogPriority, std::string const& line) { outside.push_back(line); });
    {
        Base::LogCapture const capture;
        Log::Lock(3).logStreamLine() << "inside";
        EXPECT_THAT(capture.lines(), testing::ElementsAre("inside"));
    }
    Log::Lock(3).logStreamLine() << "outside";
    EXPECT_THAT(outside, testing::ElementsAre("outside"));
    Log::setSink(before);
}

} // namespace
