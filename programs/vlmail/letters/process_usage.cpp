#include "programs/vlmail/letters/process_usage.h"

#include <ctime>
#include <fstream>
#include <string>
#include <unistd.h>

namespace VlMail {
namespace {

std::chrono::nanoseconds processorTimeOf(pid_t process) {
    clockid_t clock{};
    timespec time{};
    if (::clock_getcpuclockid(process, &clock) != 0 || ::clock_gettime(clock, &time) != 0)
        return {};
    return std::chrono::seconds(time.tv_sec) + std::chrono::nanoseconds(time.tv_nsec);
}

std::uint64_t memoryOf(pid_t process) {
    std::ifstream pages("/proc/" + std::to_string(process) + "/statm");
    std::uint64_t all = 0;
    std::uint64_t resident = 0;
    std::uint64_t shared = 0;
    if (!(pages >> all >> resident >> shared) || shared > resident)
        return 0;
    return (resident - shared) * static_cast<std::uint64_t>(::sysconf(_SC_PAGESIZE));
}

} // namespace

ProcessUsage usageOf(pid_t process) { return {processorTimeOf(process), memoryOf(process)}; }

} // namespace VlMail
