#pragma once
// 64-bit local time, both ways, by one set of rules on every platform.

#include "vlservice/export.h"

#include <ctime>
#include <string>

namespace LocalTime {

/// Seconds since the epoch of a broken-down local time whose daylight member is 0: the zone's standard offset
/// counts, also in summer. Fields beyond the calendar roll over. Times before the epoch, and conversions that
/// overflow, give -1.
VLSERVICE_EXPORT long long toSeconds(std::tm const& local);

/// "%Y/%m/%d %H:%M:%S" of local time; the empty text when the seconds cannot be converted or when the year
/// needs more than four digits.
VLSERVICE_EXPORT std::string toText(long long seconds);

} // namespace LocalTime
