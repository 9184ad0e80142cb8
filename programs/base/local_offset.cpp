#include "programs/base/local_offset.h"

#include <ctime>

namespace Base {

long long localOffset(long long seconds) {
    std::time_t const instant = seconds;
    std::tm local{};
    return localtime_r(&instant, &local) ? local.tm_gmtoff : 0;
}

} // namespace Base
