#pragma once
// The clock that a match looks at each few thousand steps. Internal.

#include <chrono>

namespace Cfg {

struct MatchClock {
    using Time = std::chrono::steady_clock::time_point;

    int stepsToLook = 0;
    Time deadline = Time::max();
    bool isUp = false;

    /// Throws std::runtime_error when the time is up.
    void step() {
        if (--stepsToLook < 0)
            look();
    }
    void look();
};

// Each step of a match comes here, so it is reached without a call.
extern constinit thread_local MatchClock matchClock __attribute__((tls_model("initial-exec")));

} // namespace Cfg
