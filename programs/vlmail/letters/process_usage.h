#pragma once
// What a process takes of the machine.

#include <chrono>
#include <cstdint>
#include <sys/types.h>

namespace VlMail {

struct ProcessUsage {
    std::chrono::nanoseconds processor{};
    /// In bytes, without what it shares with others through files.
    std::uint64_t memory = 0;
};

/// Of a process that is not there: nothing.
ProcessUsage usageOf(pid_t process);

} // namespace VlMail
