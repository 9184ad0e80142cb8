#include "tests/faults/patience.h"

#include <algorithm>
#include <filesystem>
#include <fstream>

namespace Faults {

void Patience::pass(Duration stretch, Duration starved) {
    own_ += stretch - std::clamp(starved, Duration(0), stretch);
}

std::chrono::nanoseconds starvedTimeOf(pid_t process) {
    namespace fs = std::filesystem;
    std::chrono::nanoseconds all{0};
    std::error_code gone;
    for (fs::directory_entry const& thread :
         fs::directory_iterator("/proc/" + std::to_string(process) + "/task", gone)) {
        long long ran = 0;
        long long waited = 0;
        if (std::ifstream(thread.path() / "schedstat") >> ran >> waited)
            all += std::chrono::nanoseconds(waited);
        std::ifstream children(thread.path() / "children");
        for (pid_t child = 0; children >> child;)
            all += starvedTimeOf(child);
    }
    return all;
}

} // namespace Faults
