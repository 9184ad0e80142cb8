#include "programs/vlserviced/jobs/carrier_pace.h"

#include <gtest/gtest.h>

namespace {

using Protocol::CarrierSettings;
using VlServiced::MinuteRate;
using VlServiced::opensAt;
using VlServiced::pauseBehind;

constexpr long long AN_HOUR = 3600;

CarrierSettings withHours(std::string const& hours) {
    CarrierSettings settings;
    settings.hours = hours;
    return settings;
}

/// In minutes behind midnight, on a clock that is an hour ahead.
long long opening(std::string const& hours, long long minute) {
    long long const now = 1'700'006'400 - AN_HOUR + minute * 60;
    return (opensAt(withHours(hours), {now, [](long long) { return AN_HOUR; }}) - now) / 60;
}

TEST(PausesBehindFailures, DoubleUpToAnHour) {
    CarrierSettings settings;
    settings.retrySeconds = 30;
    std::vector<long long> pauses;
    for (long long attempts = 1; attempts <= 9; ++attempts)
        pauses.push_back(pauseBehind(attempts, settings));
    EXPECT_EQ(pauses, (std::vector<long long>{30, 60, 120, 240, 480, 960, 1920, 3600, 3600}));
    EXPECT_EQ(pauseBehind(1'000'000, settings), 3600);
    settings.retrySeconds = 3600;
    EXPECT_EQ(pauseBehind(13, settings), 3600);
}

TEST(LettersThatFail, AreGivenUpSoLongBehindTheFirstAttempt) {
    CarrierSettings settings;
    settings.giveUpHours = 2;
    EXPECT_FALSE(VlServiced::isGivenUp(0, 100 * AN_HOUR, settings));
    EXPECT_FALSE(VlServiced::isGivenUp(1000, 1000 + 2 * AN_HOUR - 1, settings));
    EXPECT_TRUE(VlServiced::isGivenUp(1000, 1000 + 2 * AN_HOUR, settings));
}

TEST(HoursOfACarrier, BeginAndEndOnTheClockOfThePlace) {
    EXPECT_EQ(opening("08:00-18:00", 8 * 60), 0);
    EXPECT_EQ(opening("08:00-18:00", 18 * 60 - 1), 0);
    EXPECT_EQ(opening("08:00-18:00", 18 * 60), 14 * 60);
    EXPECT_EQ(opening("08:00-18:00", 7 * 60 + 59), 1);
    EXPECT_EQ(opening("", 0), 0);
}

TEST(HoursOfACarrier, MayLastOverMidnight) {
    EXPECT_EQ(opening("22:00-06:00", 23 * 60), 0);
    EXPECT_EQ(opening("22:00-06:00", 60), 0);
    EXPECT_EQ(opening("22:00-06:00", 6 * 60), 16 * 60);
}

TEST(RatesOfACarrier, AreThoseOfAnyMinute) {
    CarrierSettings settings;
    settings.perMinute = 2;
    MinuteRate rate;
    EXPECT_EQ(rate.freeAt(settings, 100), 100);
    rate.add(100);
    EXPECT_EQ(rate.freeAt(settings, 130), 130);
    rate.add(130);
    EXPECT_EQ(rate.freeAt(settings, 130), 160);
    EXPECT_EQ(rate.freeAt(settings, 160), 160);
    rate.add(160);
    EXPECT_EQ(rate.freeAt(settings, 161), 190);
}

TEST(RatesOfACarrier, AreForgottenWhenTheClockIsSetBack) {
    CarrierSettings settings;
    settings.perMinute = 1;
    MinuteRate rate;
    rate.add(1000);
    EXPECT_EQ(rate.freeAt(settings, 500), 500);
}

TEST(RatesOfACarrier, AreNoneWithoutALimit) {
    MinuteRate rate;
    for (int i = 0; i < 1000; ++i)
        rate.add(100);
    EXPECT_EQ(rate.freeAt({}, 100), 100);
}

} // namespace
