#include "vlservice/extract/extract_field.h"
#include "vlservice/extract/extract_preset.h"
#include "vlservice/extract/match_time.h"
#include "vlservice/json/json_text.h"
#include "vlservice/platform/log.h"

#include <gmock/gmock.h>

#include <chrono>
#include <string>

using namespace Cfg;
using namespace std::chrono_literals;

namespace {

ExtractField fieldWith(char const* pattern) {
    return ExtractField(json::Object{{"name", "f"}, {"value_extract", pattern}});
}

/// What the field finds, or why it finds nothing.
std::string found(ExtractField const& field, std::string text) {
    std::string failure;
    auto const value = field.extractField(text, {}, [&](std::string const& reason) { failure = reason; });
    return value ? value->strVal() : failure;
}

constexpr char const* RUNAWAY = "(?<VAL>.*.*.*.*.*:)";
constexpr char const* TIME_IS_UP = "The time for matching the regular expression is up.";

class MatchTimes : public testing::Test {
    Log::Sink const before_ = Log::setSink([](LogPriority, std::string const&) {});

protected:
    ~MatchTimes() override { Log::setSink(before_); }
};

} // namespace

TEST_F(MatchTimes, EndAMatchThatGoesOnForLonger) {
    MatchTime const time(2ms);
    EXPECT_FALSE(time.isUp());
    EXPECT_EQ(found(fieldWith(RUNAWAY), std::string(900, 'x')), TIME_IS_UP);
    EXPECT_TRUE(time.isUp());
}

TEST_F(MatchTimes, LetThroughWhatIsFoundInTime) {
    MatchTime const time(1h);
    EXPECT_EQ(found(fieldWith("(?<VAL>\\d+)"), "Ref 17"), "17");
    EXPECT_FALSE(time.isUp());
}

TEST_F(MatchTimes, CountForTheInnermostAndThenForTheOuterOne) {
    MatchTime const outer(1h);
    {
        MatchTime const inner(2ms);
        EXPECT_EQ(found(fieldWith(RUNAWAY), std::string(900, 'x')), TIME_IS_UP);
        EXPECT_TRUE(inner.isUp());
    }
    EXPECT_FALSE(outer.isUp());
    EXPECT_EQ(found(fieldWith("(?<VAL>\\d+)"), std::string(100'000, 'x') + "17"), "17");
}

TEST_F(MatchTimes, EndValidationToo) {
    ExtractField const field(
        json::Object{{"name", "f"}, {"value_extract", "(?<VAL>.*)"}, {"value_match", ".*.*.*.*.*:"}});
    ExtractedField value("f", std::string(900, 'x'), 0, false, IgnoreOnGroup::MustMatch,
                         ExtractedField::ValueType::NotValidated);
    MatchTime const time(2ms);
    EXPECT_THROW(field.validate(value), std::runtime_error);
}

TEST_F(MatchTimes, EndMatchingANameToo) {
    MatchTime const time(2ms);
    EXPECT_THROW(ExtractPreset::match(".*.*.*.*.*:", std::string(900, 'x')), std::runtime_error);
    EXPECT_TRUE(time.isUp());
}

TEST_F(MatchTimes, EndNoLaterThanTheOuterOneWhichIsUpThenToo) {
    MatchTime const outer(2ms);
    {
        MatchTime const inner(1h);
        EXPECT_EQ(found(fieldWith(RUNAWAY), std::string(900, 'x')), TIME_IS_UP);
        EXPECT_TRUE(inner.isUp());
    }
    EXPECT_TRUE(outer.isUp());
}
