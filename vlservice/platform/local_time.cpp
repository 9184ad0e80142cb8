#include "vlservice/platform/local_time.h"

#include <algorithm>
#include <optional>

namespace LocalTime {
namespace {

constexpr long long SECONDS_A_DAY = 24 * 60 * 60;
constexpr long long NOT_CONVERTIBLE = -1;

/// Days from the epoch to the first of a month in the proleptic Gregorian calendar; months are zero-based.
constexpr long long daysToMonth(long long year, int month) {
    // Years begin in March, so that the leap day is the last one.
    long long const y = month < 2 ? year - 1 : year;
    long long const era = (y >= 0 ? y : y - 399) / 400;
    long long const yearOfEra = y - era * 400;
    long long const dayOfYear = (153 * ((month + 10) % 12) + 2) / 5;
    long long const dayOfEra = yearOfEra * 365 + yearOfEra / 4 - yearOfEra / 100 + dayOfYear;
    return era * 146097 + dayOfEra - 719468;
}

std::optional<long> offsetAt(long long seconds) {
    std::time_t const time = seconds;
    std::tm local{};
    if (!localtime_r(&time, &local))
        return std::nullopt;
    return local.tm_gmtoff;
}

/// The zone's standard offset in a year. Zone data calls the summer time of some countries standard time, so
/// it is the smaller of the winter's and the summer's offset that counts.
std::optional<long> standardOffset(long long year) {
    auto const january = offsetAt(daysToMonth(year, 0) * SECONDS_A_DAY);
    auto const july = offsetAt(daysToMonth(year, 6) * SECONDS_A_DAY);
    if (!january || !july)
        return std::nullopt;
    return std::min(*january, *july);
}

} // namespace

long long toSeconds(std::tm const& local) {
    // All fields are 32 bits wide, so nothing here leaves 64.
    long long const months = 1900LL * 12 + local.tm_year * 12LL + local.tm_mon;
    long long const year = months >= 0 ? months / 12 : (months - 11) / 12;
    long long const days = daysToMonth(year, static_cast<int>(months - year * 12)) + local.tm_mday - 1;
    long long const asUtc =
        days * SECONDS_A_DAY + local.tm_hour * 3600LL + local.tm_min * 60LL + local.tm_sec;
    // Days and hours may have rolled into another year.
    std::time_t const instant = asUtc;
    std::tm rolled{};
    if (!gmtime_r(&instant, &rolled))
        return NOT_CONVERTIBLE;
    auto const offset = standardOffset(rolled.tm_year + 1900LL);
    return offset ? std::max(asUtc - *offset, NOT_CONVERTIBLE) : NOT_CONVERTIBLE;
}

std::string toText(long long seconds) {
    std::time_t const time = seconds;
    std::tm local{};
    if (!localtime_r(&time, &local))
        return {};
    // Room for a year of four digits; strftime gives 0 for what does not fit.
    char text[20];
    return std::string(text, std::strftime(text, sizeof text, "%Y/%m/%d %H:%M:%S", &local));
}

} // namespace LocalTime
