#include "programs/policy/slots.h"

#include <algorithm>
#include <chrono>
#include <set>
#include <vector>

namespace Policy {
namespace {

using Delay = Cfg::PackPreset::DelayInfo;
/// A day of the calendar, whatever its place.
using Day = std::chrono::sys_days;

constexpr long long SECONDS_A_DAY = 86'400;
constexpr int MINUTES_A_DAY = 1'440;

/// What a clock shows at the begin of a day, in seconds as they are counted in UTC.
long long beginOf(Day day) { return std::chrono::sys_seconds(day).time_since_epoch().count(); }

Day dayShownAt(Moment const& moment) {
    std::chrono::sys_seconds const shown(std::chrono::seconds(moment.now + moment.offset(moment.now)));
    return std::chrono::floor<std::chrono::days>(shown);
}

/// The first instant with the offset of `after`. The clock is changed once between the two.
long long changeBetween(long long before, long long after, UtcOffset const& offset) {
    long long const changed = offset(after);
    while (after - before > 1) {
        long long const middle = before + (after - before) / 2;
        (offset(middle) == changed ? after : before) = middle;
    }
    return after;
}

/// The first instant at which the clock shows that, or more.
long long firstInstantOf(long long shown, UtcOffset const& offset) {
    // No clock is a day away from UTC.
    long long const before = shown - SECONDS_A_DAY;
    long long const instant = shown - offset(before);
    if (offset(instant) == offset(before))
        return instant;
    return std::max(changeBetween(before, instant, offset), shown - offset(instant));
}

bool isOneOf(std::set<int> const& days, int day) { return days.empty() || days.contains(day); }

bool hasSlots(Day day, Delay const& delay) {
    std::chrono::year_month_day const date(day);
    return isOneOf(delay.weekDays, static_cast<int>(std::chrono::weekday(day).c_encoding())) &&
           isOneOf(delay.monthDays, static_cast<int>(static_cast<unsigned>(date.day())));
}

/// Ascending, each once.
std::vector<long long> slotsOn(Day day, std::set<int> const& mins, UtcOffset const& offset) {
    long long const begin = beginOf(day);
    long long const ahead = offset(begin - SECONDS_A_DAY);
    bool const isChanged = offset(begin + 2 * SECONDS_A_DAY) != ahead;
    std::vector<long long> slots;
    for (int const minute : mins) {
        long long const shown = begin + minute * 60LL;
        slots.push_back(isChanged ? firstInstantOf(shown, offset) : shown - ahead);
    }
    slots.erase(std::unique(slots.begin(), slots.end()), slots.end());
    return slots;
}

/// The first number that is out of bounds, in words; empty when there is none.
std::string outside(std::set<int> const& numbers, char const* key, int lowest, int highest) {
    for (int const number : numbers)
        if (number < lowest || number > highest)
            return std::to_string(number) + " in \"" + key + "\", " + std::to_string(lowest) + " to " +
                   std::to_string(highest) + " possible";
    return {};
}

/// Empty when all numbers are days and minutes.
std::string noSuchNumber(Delay const& delay) {
    if (delay.count < 0)
        return std::to_string(delay.count) + " in \"count\", 0 and above possible";
    for (std::string const& wrong :
         {outside(delay.weekDays, "week_days", 0, 6), outside(delay.monthDays, "month_days", 1, 31),
          outside(delay.mins, "mins", 0, MINUTES_A_DAY - 1)})
        if (!wrong.empty())
            return wrong;
    return {};
}

} // namespace

std::optional<long long> slotAfter(Delay const& delay, Moment const& moment) {
    if (!noSuchNumber(delay).empty())
        return std::nullopt;
    std::set<int> const mins = delay.mins.empty() ? std::set{0} : delay.mins;
    auto left = static_cast<std::size_t>(std::max(delay.count, 1));
    long long behind = moment.now;
    Day const first = dayShownAt(moment);
    for (Day day = first; day <= first + std::chrono::days(MAX_DELAY_DAYS); day += std::chrono::days(1)) {
        if (!hasSlots(day, delay))
            continue;
        std::vector<long long> const slots = slotsOn(day, mins, moment.offset);
        auto const next = std::upper_bound(slots.begin(), slots.end(), behind);
        auto const there = static_cast<std::size_t>(slots.end() - next);
        if (left <= there)
            return *(next + static_cast<std::ptrdiff_t>(left - 1));
        left -= there;
        behind = std::max(behind, slots.back());
    }
    return std::nullopt;
}

std::string whyImpossible(Delay const& delay, Moment const& moment) {
    if (std::string wrong = noSuchNumber(delay); !wrong.empty() || slotAfter(delay, moment))
        return wrong;
    std::string const slot = delay.count > 1 ? "slot " + std::to_string(delay.count) : "no slot";
    return slot + (delay.count > 1 ? " is not reached within " : " within ") +
           std::to_string(MAX_DELAY_DAYS) + " days";
}

} // namespace Policy
