#include "vlservice/extract/match_time.h"

#include "vlservice/extract/match_clock.h"

#include <algorithm>
#include <stdexcept>

namespace Cfg {

constinit thread_local MatchClock matchClock;

// Some 100 microseconds.
constexpr int STEPS_BETWEEN_LOOKS = 1 << 14;

void MatchClock::look() {
    stepsToLook = STEPS_BETWEEN_LOOKS;
    if (deadline == Time::max() || std::chrono::steady_clock::now() < deadline)
        return;
    isUp = true;
    throw std::runtime_error("The time for matching the regular expression is up.");
}

MatchTime::MatchTime(std::chrono::steady_clock::duration limit)
    : outerDeadline_(matchClock.deadline), outerIsUp_(matchClock.isUp) {
    matchClock.deadline = std::min(outerDeadline_, std::chrono::steady_clock::now() + limit);
    matchClock.isUp = false;
    // Where there is time for more, the first look would be for nothing.
    matchClock.stepsToLook = limit > std::chrono::milliseconds(1) ? STEPS_BETWEEN_LOOKS : 0;
}

MatchTime::~MatchTime() {
    // What ended at the outer one's end has ended that too.
    bool const endedOuter = matchClock.isUp && matchClock.deadline == outerDeadline_;
    matchClock.deadline = outerDeadline_;
    matchClock.isUp = outerIsUp_ || endedOuter;
}

bool MatchTime::isUp() const { return matchClock.isUp; }

} // namespace Cfg
