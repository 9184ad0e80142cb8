// The slots of delays, against a calendar that is counted day by day and minute by minute.
#include "programs/policy/slots.h"

#include "programs/base/local_offset.h"
#include "tests/support/time_zone.h"

#include <gmock/gmock.h>

#include <cstdio>
#include <ctime>
#include <random>

namespace {

using Delay = Cfg::PackPreset::DelayInfo;
using Policy::Moment;
using Policy::slotAfter;
using Policy::whyImpossible;

constexpr long long DAY = 86'400;

struct DelayNumbers {
    int count = 0;
    std::set<int> weekDays = {};
    std::set<int> monthDays = {};
    std::set<int> mins = {};

    operator Delay() const {
        Delay delay;
        delay.count = count;
        delay.weekDays = weekDays;
        delay.monthDays = monthDays;
        delay.mins = mins;
        return delay;
    }
};

Moment here(long long now) { return {now, &Base::localOffset}; }

std::tm shownAt(long long instant) {
    std::time_t const time = instant;
    std::tm local{};
    localtime_r(&time, &local);
    return local;
}

/// "2026-03-29 03:00:00 +2" by the clock of the place.
std::string inWords(std::optional<long long> instant) {
    if (!instant)
        return "never";
    char text[64];
    std::tm const local = shownAt(*instant);
    std::strftime(text, sizeof text, "%Y-%m-%d %H:%M:%S %z", &local);
    return text;
}

/// The first instant at which the clock shows that time.
long long at(int year, int month, int day, int hour = 0, int minute = 0) {
    std::tm local{};
    local.tm_year = year - 1900;
    local.tm_mon = month - 1;
    local.tm_mday = day;
    local.tm_hour = hour;
    local.tm_min = minute;
    local.tm_isdst = -1;
    return std::mktime(&local);
}

/// A calendar that knows nothing but what the clock shows minute by minute: a slot is where it comes to show
/// one, or jumps over one, for the first time.
class CountedCalendar {
public:
    explicit CountedCalendar(Delay delay) : delay_(std::move(delay)) {
        if (delay_.mins.empty())
            delay_.mins = {0};
    }

    std::optional<long long> slotAfter(long long accepted) {
        long long const start = accepted - accepted % 60 - 2 * DAY;
        long long latest = shown(start);
        int left = std::max(delay_.count, 1);
        for (long long now = start + 60; now < accepted + 402 * DAY; now += 60) {
            bool isSlot = false;
            for (long long minute = latest + 60; minute <= shown(now); minute += 60)
                isSlot = isSlot || names(minute);
            latest = std::max(latest, shown(now));
            if (isSlot && now > accepted && --left == 0)
                return now;
        }
        return std::nullopt;
    }

private:
    static long long shown(long long instant) { return instant + Base::localOffset(instant); }
    bool names(long long shownTime) const {
        std::time_t const time = shownTime;
        std::tm date{};
        gmtime_r(&time, &date);
        auto const isOneOf = [](std::set<int> const& days, int day) {
            return days.empty() || days.contains(day);
        };
        return isOneOf(delay_.weekDays, date.tm_wday) && isOneOf(delay_.monthDays, date.tm_mday) &&
               delay_.mins.contains(date.tm_hour * 60 + date.tm_min);
    }

    Delay delay_;
};

TEST(Slots, LieStrictlyBehindTheAcceptance) {
    VLServiceTest::TimeZone const zone("Europe/Berlin");
    Delay const atNine = DelayNumbers{.mins = {9 * 60}};
    EXPECT_EQ(inWords(slotAfter(atNine, here(at(2026, 11, 22, 8, 59)))), "2026-11-22 09:00:00 +0100");
    EXPECT_EQ(inWords(slotAfter(atNine, here(at(2026, 11, 22, 9, 0) - 1))), "2026-11-22 09:00:00 +0100");
    EXPECT_EQ(inWords(slotAfter(atNine, here(at(2026, 11, 22, 9, 0)))), "2026-11-23 09:00:00 +0100");
}

TEST(Slots, AreAtMidnightOfAnyDayUnlessTheDelaySaysMore) {
    VLServiceTest::TimeZone const zone("Europe/Berlin");
    EXPECT_EQ(inWords(slotAfter({}, here(at(2026, 12, 31, 23, 59)))), "2027-01-01 00:00:00 +0100");
}

TEST(Slots, AreCountedFromOneAndNoneMeansTheFirst) {
    VLServiceTest::TimeZone const zone("Europe/Berlin");
    long long const now = at(2026, 11, 22, 12);
    for (auto const& [count, slot] : {std::pair{0, "2026-11-22 18:00:00 +0100"},
                                      {1, "2026-11-22 18:00:00 +0100"},
                                      {2, "2026-11-23 06:00:00 +0100"},
                                      {3, "2026-11-23 18:00:00 +0100"},
                                      {801, "2027-12-27 18:00:00 +0100"},
                                      {802, "never"}})
        EXPECT_EQ(inWords(slotAfter(DelayNumbers{.count = count, .mins = {360, 1080}}, here(now))), slot)
            << count;
}

TEST(Slots, WantBothDaysWhereBothAreNamed) {
    VLServiceTest::TimeZone const zone("Europe/Berlin");
    // The next Friday that is a 13th.
    EXPECT_EQ(inWords(slotAfter(DelayNumbers{.weekDays = {5}, .monthDays = {13}}, here(at(2026, 11, 22)))),
              "2027-08-13 00:00:00 +0200");
    EXPECT_EQ(inWords(slotAfter(DelayNumbers{.weekDays = {0, 6}}, here(at(2026, 11, 22)))),
              "2026-11-28 00:00:00 +0100");
    EXPECT_EQ(inWords(slotAfter(DelayNumbers{.monthDays = {31}}, here(at(2026, 11, 22)))),
              "2026-12-31 00:00:00 +0100");
}

TEST(Slots, MoveBehindAGapOfTheClock) {
    VLServiceTest::TimeZone const zone("Europe/Berlin");
    long long const eve = at(2026, 3, 28, 12);
    EXPECT_EQ(inWords(slotAfter(DelayNumbers{.mins = {150}}, here(eve))), "2026-03-29 03:00:00 +0200");
    // Two that are skipped, and the one behind the gap, are one slot.
    EXPECT_EQ(inWords(slotAfter(DelayNumbers{.count = 2, .mins = {120, 150, 180}}, here(eve))),
              "2026-03-30 02:00:00 +0200");
    EXPECT_EQ(inWords(slotAfter(DelayNumbers{.mins = {119}}, here(eve))), "2026-03-29 01:59:00 +0100");
}

TEST(Slots, CountADoubledHourOnceAtItsFirstTime) {
    VLServiceTest::TimeZone const zone("Europe/Berlin");
    long long const eve = at(2026, 10, 24, 12);
    Delay const halfPastTwo = DelayNumbers{.mins = {150}};
    std::optional<long long> const first = slotAfter(halfPastTwo, here(eve));
    EXPECT_EQ(inWords(first), "2026-10-25 02:30:00 +0200");
    EXPECT_EQ(inWords(slotAfter(halfPastTwo, here(first.value()))), "2026-10-26 02:30:00 +0100");
    // Between the two times that the clock shows it.
    EXPECT_EQ(inWords(slotAfter(halfPastTwo, here(*first + 1800))), "2026-10-26 02:30:00 +0100");
    EXPECT_EQ(inWords(slotAfter(DelayNumbers{.mins = {180}}, here(eve))), "2026-10-25 03:00:00 +0100");
}

TEST(Slots, AreThoseOfACountedCalendarOverTheYearInManyPlaces) {
    std::mt19937 random(20'261'122);
    auto const some = [&](int lowest, int highest, int most) {
        std::set<int> numbers;
        for (int i = static_cast<int>(random() % static_cast<unsigned>(most + 1)); i > 0; --i)
            numbers.insert(lowest + static_cast<int>(random() % static_cast<unsigned>(highest - lowest + 1)));
        return numbers;
    };
    // Among them half an hour of summer time, a change at midnight, and none at all.
    for (char const* place :
         {"Europe/Berlin", "Australia/Lord_Howe", "Asia/Kolkata", "Asia/Beirut", "America/New_York"}) {
        VLServiceTest::TimeZone const zone(place);
        for (int round = 0; round < 12; ++round) {
            Delay const delay = DelayNumbers{.count = static_cast<int>(random() % 4),
                                             .weekDays = some(0, 6, 3),
                                             .monthDays = some(1, 31, 6),
                                             .mins = some(0, 240, 3)};
            long long const now = at(2026, 1, 1) + static_cast<long long>(random() % (365 * DAY));
            EXPECT_EQ(inWords(slotAfter(delay, here(now))), inWords(CountedCalendar(delay).slotAfter(now)))
                << place << ' ' << round << ' ' << now;
        }
    }
}

TEST(Slots, AreThoseOfACountedCalendarOverBothChangesOfTheClock) {
    for (char const* place : {"Europe/Berlin", "Australia/Lord_Howe", "Asia/Beirut"}) {
        VLServiceTest::TimeZone const zone(place);
        for (long long day = at(2026, 1, 1); day < at(2027, 1, 1); day += DAY) {
            if (Base::localOffset(day - DAY) == Base::localOffset(day + DAY))
                continue;
            for (int minute = 0; minute < 300; minute += 7)
                for (int const count : {1, 2}) {
                    Delay const delay = DelayNumbers{.count = count, .mins = {minute, minute + 11, 1439}};
                    EXPECT_EQ(inWords(slotAfter(delay, here(day + 10))),
                              inWords(CountedCalendar(delay).slotAfter(day + 10)))
                        << place << ' ' << minute;
                }
        }
    }
}

TEST(ImpossibleDelays, SayWhatKeepsThemFromEnding) {
    VLServiceTest::TimeZone const zone("Europe/Berlin");
    std::pair<DelayNumbers, char const*> const cases[] = {
        {{}, ""},
        {{.count = 400}, ""},
        {{.weekDays = {9}}, "9 in \"week_days\", 0 to 6 possible"},
        {{.weekDays = {-1, 3}}, "-1 in \"week_days\", 0 to 6 possible"},
        {{.monthDays = {0}}, "0 in \"month_days\", 1 to 31 possible"},
        {{.monthDays = {32}}, "32 in \"month_days\", 1 to 31 possible"},
        {{.mins = {9999}}, "9999 in \"mins\", 0 to 1439 possible"},
        {{.mins = {1440}}, "1440 in \"mins\", 0 to 1439 possible"},
        {{.count = -1}, "-1 in \"count\", 0 and above possible"},
        {{.count = 401}, "slot 401 is not reached within 400 days"},
        {{.count = 2'000'000'000}, "slot 2000000000 is not reached within 400 days"},
        {{.weekDays = {1}, .monthDays = {31}}, ""},
    };
    for (auto const& [delay, why] : cases)
        EXPECT_EQ(whyImpossible(delay, here(at(2026, 11, 22, 12))), why);
    // One Friday is a 13th by then, in August.
    EXPECT_EQ(
        whyImpossible(DelayNumbers{.count = 2, .weekDays = {5}, .monthDays = {13}}, here(at(2026, 11, 14))),
        "slot 2 is not reached within 400 days");
    EXPECT_EQ(slotAfter(DelayNumbers{.weekDays = {9}}, here(0)), std::nullopt);
}

} // namespace
