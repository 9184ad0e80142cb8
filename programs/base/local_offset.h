#pragma once
// The clock on the wall of this machine's place.

namespace Base {

/// How many seconds local time is ahead of UTC at an instant, which is in seconds since the epoch; 0 when
/// that is beyond the calendar.
long long localOffset(long long seconds);

} // namespace Base
