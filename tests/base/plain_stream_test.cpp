#include "programs/base/plain_stream.h"

#include <gtest/gtest.h>

#include <fstream>
#include <sstream>

namespace {

TEST(PlainStream, HandsFinishedLinesOnAsPlainText) {
    std::ostringstream target;
    Base::PlainStream stream(target);
    stream << "a\x1b[2J" << 1;
    EXPECT_EQ(target.str(), "");
    stream << "\nb\xE2\x80";
    EXPECT_EQ(target.str(), "a\\u001b[2J1\n");
    stream << "\xAE" << std::flush;
    EXPECT_EQ(target.str(), "a\\u001b[2J1\nb\\u202e");
}

TEST(PlainStream, HandsOnWhatIsLeftInTheEnd) {
    std::ostringstream target;
    { Base::PlainStream(target) << "no line\xC3"; }
    EXPECT_EQ(target.str(), "no line\uFFFD");
}

TEST(PlainStream, CutsALongLineBetweenCharacters) {
    std::ostringstream target;
    Base::PlainStream stream(target);
    std::string text;
    for (int i = 0; i < 100'000; ++i) {
        stream << "ü";
        text += "ü";
    }
    EXPECT_GT(target.str().size(), 60'000u);
    stream << std::flush;
    EXPECT_EQ(target.str(), text);
}

TEST(PlainStream, FailsWhereItsTargetFails) {
    std::ofstream full("/dev/full");
    Base::PlainStream stream(full);
    stream << "x\n" << std::flush;
    EXPECT_FALSE(stream);
}

} // namespace
