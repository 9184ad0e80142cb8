#pragma once
// How long one waits for a process: its own time, not what a busy machine gives to others.

#include <chrono>
#include <sys/types.h>

namespace Faults {

class Patience {
public:
    using Duration = std::chrono::nanoseconds;

    explicit Patience(Duration limit) : limit_(limit) {}

    /// A stretch of the clock, in part of which a process was ready to go on and had no processor.
    void pass(Duration stretch, Duration starved);
    bool isOver() const { return own_ >= limit_; }

private:
    Duration limit_;
    Duration own_{0};
};

/// How long it and all that has come of it, as far as it still runs, had to wait for a processor.
std::chrono::nanoseconds starvedTimeOf(pid_t process);

} // namespace Faults
