#pragma once
// How long patterns may take.

#include "vlservice/export.h"

#include <chrono>

namespace Cfg {

/// While it lives, the matches of fields, validators and names of documents on this thread have that much
/// time together, by the steady clock. One that would go on for longer ends as one that is too complex does:
/// the field is not found, and validating or matching a name throws std::runtime_error. Without it only the
/// engine's own limit of states holds. The innermost one counts, which ends no later than the outer ones.
class VLSERVICE_EXPORT MatchTime {
public:
    explicit MatchTime(std::chrono::steady_clock::duration limit); ///< from now on
    MatchTime(MatchTime const&) = delete;
    MatchTime& operator=(MatchTime const&) = delete;
    ~MatchTime();

    /// Whether a match was ended.
    bool isUp() const;

private:
    std::chrono::steady_clock::time_point outerDeadline_;
    bool outerIsUp_;
};

} // namespace Cfg
