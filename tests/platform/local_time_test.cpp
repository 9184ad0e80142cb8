#include "vlservice/platform/local_time.h"

#include "tests/support/foreign_locale.h"
#include "tests/support/time_zone.h"

#include <gtest/gtest.h>

#include <climits>
#include <string>

namespace {

using VLServiceTest::TimeZone;

/// Months as people count them.
std::tm local(int year, int month, int day, int hour = 0, int minute = 0, int second = 0) {
    std::tm time{};
    time.tm_year = year - 1900;
    time.tm_mon = month - 1;
    time.tm_mday = day;
    time.tm_hour = hour;
    time.tm_min = minute;
    time.tm_sec = second;
    return time;
}

long long seconds(int year, int month, int day, int hour = 0, int minute = 0, int second = 0) {
    return LocalTime::toSeconds(local(year, month, day, hour, minute, second));
}

TEST(LocalTimeInUtc, ConvertsBothWays) {
    TimeZone const zone("UTC");
    EXPECT_EQ(seconds(1970, 1, 1), 0);
    EXPECT_EQ(seconds(2024, 2, 29, 12, 30, 5), 1709209805);
    EXPECT_EQ(LocalTime::toText(1709209805), "2024/02/29 12:30:05");
    EXPECT_EQ(LocalTime::toText(0), "1970/01/01 00:00:00");
}

TEST(LocalTimeInUtc, RollsFieldsBeyondTheCalendarOver) {
    TimeZone const zone("UTC");
    EXPECT_EQ(seconds(2021, 2, 31), seconds(2021, 3, 3));
    EXPECT_EQ(seconds(2021, 13, 1), seconds(2022, 1, 1));
    EXPECT_EQ(seconds(2021, 0, 1), seconds(2020, 12, 1));
    EXPECT_EQ(seconds(2021, -11, 1), seconds(2020, 1, 1));
    EXPECT_EQ(seconds(2021, 1, 0), seconds(2020, 12, 31));
    EXPECT_EQ(seconds(2021, 1, 1, 24), seconds(2021, 1, 2));
    EXPECT_EQ(seconds(2021, 1, 1, 0, -1), seconds(2020, 12, 31, 23, 59));
    EXPECT_EQ(seconds(2021, 1, 1, 0, 0, 86400), seconds(2021, 1, 2));
    EXPECT_EQ(seconds(2021, 12, 31, 23, 59, 60), seconds(2022, 1, 1));
}

TEST(LocalTimeInUtc, GivesMinusOneBeforeTheEpoch) {
    TimeZone const zone("UTC");
    EXPECT_EQ(seconds(1969, 12, 31, 23, 59, 59), -1);
    EXPECT_EQ(seconds(1969, 12, 31, 23, 59, 58), -1);
    EXPECT_EQ(seconds(1900, 6, 15), -1);
    EXPECT_EQ(seconds(1, 1, 1), -1);
    EXPECT_EQ(seconds(1970, 1, -3), -1);
}

TEST(LocalTimeInUtc, HasNoUpperEnd) {
    TimeZone const zone("UTC");
    EXPECT_EQ(seconds(3001, 1, 1), 32535216000);
    EXPECT_EQ(seconds(9999, 12, 31, 23, 59, 59), 253402300799);
    EXPECT_EQ(seconds(10000, 1, 1), 253402300800);
}

TEST(LocalTimeInUtc, GivesMinusOneWhenTheConversionOverflows) {
    TimeZone const zone("UTC");
    std::tm last = local(2024, 12, 31, 23, 59, 59);
    last.tm_year = INT_MAX;
    EXPECT_EQ(LocalTime::toSeconds(last), 67768036191676799);
    last.tm_sec = 60;
    EXPECT_EQ(LocalTime::toSeconds(last), -1);
    std::tm const extreme{INT_MAX, INT_MAX, INT_MAX, INT_MAX, INT_MAX, INT_MAX, 0, 0, 0, 0, nullptr};
    EXPECT_EQ(LocalTime::toSeconds(extreme), -1);
    std::tm const lowest{INT_MIN, INT_MIN, INT_MIN, INT_MIN, INT_MIN, INT_MIN, 0, 0, 0, 0, nullptr};
    EXPECT_EQ(LocalTime::toSeconds(lowest), -1);
}

TEST(LocalTimeInUtc, AgreesWithTheSystemOverTheWholeCalendar) {
    TimeZone const zone("UTC");
    for (long long day = 0; day < 400 * 366; day += 13) {
        std::time_t const time = day * 86400 + day % 86400;
        std::tm broken{};
        ASSERT_TRUE(gmtime_r(&time, &broken));
        ASSERT_EQ(LocalTime::toSeconds(broken), time);
    }
}

TEST(LocalTimeText, IsEmptyForAYearOfFiveDigits) {
    TimeZone const zone("UTC");
    EXPECT_EQ(LocalTime::toText(253402300799), "9999/12/31 23:59:59");
    EXPECT_EQ(LocalTime::toText(253402300800), "");
}

TEST(LocalTimeText, IsEmptyForSecondsThatCannotBeConverted) {
    TimeZone const zone("UTC");
    EXPECT_EQ(LocalTime::toText(LLONG_MAX), "");
    EXPECT_EQ(LocalTime::toText(LLONG_MIN), "");
}

TEST(LocalTimeText, OfSecondsBeforeTheEpoch) {
    TimeZone const zone("UTC");
    EXPECT_EQ(LocalTime::toText(-1), "1969/12/31 23:59:59");
}

TEST(LocalTimeText, IsThatOfTheClassicLocale) {
    TimeZone const zone("UTC");
    VLServiceTest::ForeignLocale const foreign;
    EXPECT_EQ(LocalTime::toText(1709209805), "2024/02/29 12:30:05");
}

struct ZoneCase {
    char const* name;
    char const* zone;
    std::tm date;
    long long seconds;
    char const* text;
};

TEST(LocalTimeInZones, CountsTheStandardOffsetAlsoInSummer) {
    ZoneCase const cases[] = {
        {"Berlin, winter", "Europe/Berlin", local(2024, 1, 15), 1705273200, "2024/01/15 00:00:00"},
        {"Berlin, summer: an hour later", "Europe/Berlin", local(2024, 7, 1), 1719788400,
         "2024/07/01 01:00:00"},
        {"Dublin, winter: on its day", "Europe/Dublin", local(2024, 1, 15), 1705276800,
         "2024/01/15 00:00:00"},
        {"Dublin, summer: an hour later", "Europe/Dublin", local(2024, 7, 1), 1719792000,
         "2024/07/01 01:00:00"},
        {"Sydney, winter", "Australia/Sydney", local(2024, 7, 1), 1719756000, "2024/07/01 00:00:00"},
        {"Sydney, summer: an hour later", "Australia/Sydney", local(2024, 1, 15), 1705240800,
         "2024/01/15 01:00:00"},
        {"New York, winter", "America/New_York", local(2024, 1, 15), 1705294800, "2024/01/15 00:00:00"},
        {"Kolkata, half an hour", "Asia/Kolkata", local(2024, 1, 15), 1705257000, "2024/01/15 00:00:00"},
    };
    for (ZoneCase const& c : cases) {
        SCOPED_TRACE(c.name);
        TimeZone const zone(c.zone);
        EXPECT_EQ(LocalTime::toSeconds(c.date), c.seconds);
        EXPECT_EQ(LocalTime::toText(c.seconds), c.text);
    }
}

TEST(LocalTimeInZones, TakesTheOffsetOfTheYearThatTheFieldsRollInto) {
    // London kept summer time all through 1970.
    TimeZone const zone("Europe/London");
    EXPECT_EQ(seconds(1970, 6, 1), seconds(1971, -6, 1));
    EXPECT_EQ(seconds(1971, 13, 1), seconds(1972, 1, 1));
}

TEST(LocalTimeInZones, GivesMinusOneForTheEpochsFirstHourEastOfGreenwich) {
    TimeZone const zone("Europe/Berlin");
    EXPECT_EQ(seconds(1970, 1, 1), -1);
    EXPECT_EQ(seconds(1970, 1, 1, 1), 0);
}

TEST(LocalTimeInZones, StartsInTheYearBeforeWestOfGreenwich) {
    TimeZone const zone("America/New_York");
    EXPECT_EQ(seconds(1969, 12, 31, 19), 0);
    EXPECT_EQ(seconds(1969, 12, 31, 18, 59, 59), -1);
}

} // namespace
