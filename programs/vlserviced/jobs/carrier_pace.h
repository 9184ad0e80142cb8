#pragma once
// When a carrier may be given letters, and when a letter is tried again.

#include "programs/policy/slots.h"
#include "programs/protocol/carrier.h"

#include <deque>

namespace VlServiced {

/// In seconds, behind that many attempts that failed: it doubles up to an hour.
long long pauseBehind(long long attempts, Protocol::CarrierSettings const& settings);

/// Whether a letter has been tried for long enough.
bool isGivenUp(long long firstTry, long long now, Protocol::CarrierSettings const& settings);

/// When the carrier's hours begin next; the moment itself within them.
long long opensAt(Protocol::CarrierSettings const& settings, Policy::Moment const& moment);

/// How often a carrier was given something within the last minute.
class MinuteRate {
public:
    void add(long long now) { given_.push_back(now); }
    /// When the carrier may be given more; `now` when it may at once.
    long long freeAt(Protocol::CarrierSettings const& settings, long long now);

private:
    /// Seconds since the epoch, the oldest first.
    std::deque<long long> given_;
};

} // namespace VlServiced
