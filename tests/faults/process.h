#pragma once
// A program that is run to its end with a call that fails.

#include "tests/faults/fault.h"

#include <chrono>
#include <filesystem>
#include <map>
#include <optional>
#include <string>
#include <sys/types.h>
#include <vector>

namespace Faults {

class ForkServer;

/// What waitpid() says of the server's process, which is killed, with all that has come of it, when it is
/// over or late: nothing then. Time in which others have the processor does not count.
std::optional<int> awaitEndOrKill(ForkServer& server, pid_t process, std::chrono::milliseconds limit);

struct Ended {
    /// The exit status, or minus the number of the signal that ended it.
    int status = 0;
    std::string out;
    std::string err;
    /// How many calls of the fault's kind there were, up to the end.
    long calls = 0;
    bool isLate = false;
};

struct Place {
    std::filesystem::path folder;
    /// What differs from this process's.
    std::map<std::string, std::string> environment = {};
};

/// Runs it there; its count stands in a file beside the folder meanwhile. What takes longer is late.
Ended runWith(Fault const& fault, std::filesystem::path const& program, std::vector<std::string> arguments,
              Place const& place, std::chrono::milliseconds limit = std::chrono::minutes(2));

} // namespace Faults
