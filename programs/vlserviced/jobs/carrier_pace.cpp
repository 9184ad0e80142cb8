#include "programs/vlserviced/jobs/carrier_pace.h"

#include <algorithm>

namespace VlServiced {
namespace {

constexpr long long SECONDS_AN_HOUR = 3600;
constexpr long long SECONDS_A_DAY = 24 * SECONDS_AN_HOUR;
constexpr long long SECONDS_A_MINUTE = 60;

bool isWithin(Protocol::DayWindow const& window, long long minute) {
    return window.begin < window.end ? window.begin <= minute && minute < window.end
                                     : window.begin <= minute || minute < window.end;
}

} // namespace

long long pauseBehind(long long attempts, Protocol::CarrierSettings const& settings) {
    // Twelve doublings of a second are more than an hour.
    long long const doublings = std::clamp(attempts - 1, 0LL, 12LL);
    return std::min(settings.retrySeconds << doublings, SECONDS_AN_HOUR);
}

bool isGivenUp(long long firstTry, long long now, Protocol::CarrierSettings const& settings) {
    return firstTry > 0 && now - firstTry >= settings.giveUpHours * SECONDS_AN_HOUR;
}

long long opensAt(Protocol::CarrierSettings const& settings, Policy::Moment const& moment) {
    auto const window = settings.window();
    long long const shown = moment.now + moment.offset(moment.now);
    long long const second = (shown % SECONDS_A_DAY + SECONDS_A_DAY) % SECONDS_A_DAY;
    if (!window || isWithin(*window, second / SECONDS_A_MINUTE))
        return moment.now;
    return moment.now + (window->begin * SECONDS_A_MINUTE - second + SECONDS_A_DAY) % SECONDS_A_DAY;
}

long long MinuteRate::freeAt(Protocol::CarrierSettings const& settings, long long now) {
    while (!given_.empty() && (given_.front() <= now - SECONDS_A_MINUTE || given_.front() > now))
        given_.pop_front();
    if (settings.perMinute == 0 || given_.size() < static_cast<std::size_t>(settings.perMinute))
        return now;
    return given_[given_.size() - static_cast<std::size_t>(settings.perMinute)] + SECONDS_A_MINUTE;
}

} // namespace VlServiced
