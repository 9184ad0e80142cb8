#pragma once
// How long the patterns of a document may take, together and each.

#include "vlservice/extract/match_time.h"

#include <chrono>

namespace Reader {

struct PatternLimits {
    std::chrono::milliseconds field{2'000};
    std::chrono::milliseconds document{20'000};
};

/// What is left for a document.
class PatternTime {
public:
    using Clock = std::chrono::steady_clock;

    explicit PatternTime(PatternLimits const& limits = {}) : limits_(limits), left_(limits.document) {}

    /// The patterns of one field, which end in time.
    class Turn {
    public:
        explicit Turn(PatternTime& time)
            : time_(time), begin_(Clock::now()),
              match_(time.left_ < time.limits_.field ? time.left_ : Clock::duration(time.limits_.field)) {}
        Turn(Turn const&) = delete;
        Turn& operator=(Turn const&) = delete;
        ~Turn() { time_.left_ -= Clock::now() - begin_; }

        /// Whether a pattern was ended.
        bool isUp() const { return match_.isUp(); }

    private:
        PatternTime& time_;
        Clock::time_point begin_;
        Cfg::MatchTime match_;
    };

    bool isUp() const { return left_ <= Clock::duration::zero(); }
    PatternLimits const& limits() const { return limits_; }

private:
    PatternLimits limits_;
    Clock::duration left_;
};

} // namespace Reader
