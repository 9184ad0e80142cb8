#pragma once
// What happens to a field when several letters are considered for one group.

#include <cstdint>

/// Fields with a positive number are left out of the comparison that decides whether two letters may be
/// grouped, and their values are merged by the rule of the number; the others must agree. On the wire it is
/// the number.
enum class IgnoreOnGroup : std::int32_t {
    NeverSame = -1, ///< compared, and never equal: the letter groups with nothing
    MustMatch = 0,
    Sum = 1,
    Min = 2,
    Max = 3,
    KeepFirst = 4,
    KeepLast = 5,
    Collect = 6, ///< all values in a JSON array
};
