#pragma once
// When a delayed mailing may go out: the slots that its pack preset names, on the clock of a place.

#include "vlservice/presets/pack_preset.h"

#include <functional>
#include <optional>
#include <string>

namespace Policy {

/// How many seconds the clock of a place is ahead of UTC at an instant, which is in seconds since the epoch.
using UtcOffset = std::function<long long(long long instant)>;

/// An instant, and the clock of the place that it is looked at from.
struct Moment {
    long long now = 0;
    UtcOffset offset;
};

/// How far ahead a slot may lie.
inline constexpr int MAX_DELAY_DAYS = 400;

/// The instant of the slot that a mailing accepted at `moment` waits for: the "count"-th strictly behind it.
/// Its day is one of "week_days" and of "month_days", each of which means any when it is empty, and it is at
/// one of "mins", midnight when there are none. A time that the clock shows twice counts once, at its first;
/// one that the clock skips moves to the first minute behind the gap. Nothing when whyImpossible() says why.
std::optional<long long> slotAfter(Cfg::PackPreset::DelayInfo const& delay, Moment const& moment);

/// What keeps a delay from ever ending: a number that is no day or minute, or no slot within MAX_DELAY_DAYS.
/// Empty when it ends.
std::string whyImpossible(Cfg::PackPreset::DelayInfo const& delay, Moment const& moment);

} // namespace Policy
