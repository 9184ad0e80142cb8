#include "programs/policy/course.h"

#include "tests/vlserviced/json_help.h"

#include <gmock/gmock.h>

namespace {

using Policy::Course;

constexpr long long NOON = 1'795'003'200;

Course courseOf(std::string const& keys) {
    Cfg::PackPreset const preset(parse(R"({"name": "Bills")" + (keys.empty() ? "" : ", " + keys) + "}"), {});
    return Policy::courseOf(preset, {NOON, [](long long) { return 0LL; }});
}

std::string inWords(Course const& course) {
    std::string words = "makes a container";
    words += course.handsOver ? ", hands it over" : "";
    words += course.holds ? ", holds it" : "";
    words += course.isTrial ? ", for a trial" : "";
    return words + (course.due == 0 ? "" : ", due " + std::to_string(course.due - NOON));
}

TEST(Courses, FollowTheBitsOfTheProcessMode) {
    std::pair<int, char const*> const cases[] = {
        {0, "makes a container"},
        {1, "makes a container"},
        {2, "makes a container, hands it over"},
        {3, "makes a container, hands it over"},
        {8, "makes a container, holds it"},
        {9, "makes a container, holds it"},
        {128, "makes a container, for a trial"},
        {131, "makes a container, hands it over, for a trial"},
        // Bits that mean nothing here are carried.
        {1 | 4 | 16 | 32 | 64, "makes a container"},
    };
    for (auto const& [mode, words] : cases)
        EXPECT_EQ(inWords(courseOf("\"process_mode\": " + std::to_string(mode))), words) << mode;
}

TEST(Courses, WaitForTheSlotOfADelay) {
    // Noon is at 12:00 UTC.
    EXPECT_EQ(inWords(courseOf(R"("delay": {"mins": [780]}, "process_mode": 2)")),
              "makes a container, hands it over, due 3600");
    EXPECT_EQ(inWords(courseOf(R"("delay": {})")), "makes a container, due 43200");
    EXPECT_EQ(inWords(courseOf(R"("delay": {"mins": [9999]})")), "makes a container");
}

} // namespace
