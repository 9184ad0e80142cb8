#pragma once
// What may go wrong in an installation for a while, and ends.

#include "tests/chaos/installation.h"

#include <chrono>
#include <random>
#include <string>
#include <vector>

namespace Chaos {

/// Those that are about the database come to their end before those that are about a service.
enum class Kind {
    FullDisk,
    DatabaseCrash,
    DatabaseStall,
    DatabaseCut,
    ServiceKill,
    ServiceFreeze,
    ClientCut,
};

inline constexpr std::array ALL_KINDS{Kind::FullDisk,    Kind::DatabaseCrash, Kind::DatabaseStall,
                                      Kind::DatabaseCut, Kind::ServiceKill,   Kind::ServiceFreeze,
                                      Kind::ClientCut};

struct Fault {
    Kind kind = Kind::ServiceKill;
    std::size_t service = 0;
    /// Behind how many pieces a connection is cut.
    int pieces = 0;

    void begin(Installation& installation) const;
    void end(Installation& installation) const;
    std::string text() const;
};

/// One thing, or two at once, for a while.
struct Step {
    std::vector<Fault> faults;
    std::chrono::milliseconds time{0};

    static Step random(std::mt19937& random);
    void run(Installation& installation) const;
    std::string text() const;
};

} // namespace Chaos
