#pragma once
// How long the patterns of a document may take, together and each.

#include "vlservice/extract/match_time.h"

#include <algorithm>
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

    /// The patterns of one field, which end in time. A field that has more than one turn has `spent` some of
    /// its time before.
    class Turn {
    public:
        explicit Turn(PatternTime& time, Clock::duration spent = {})
            : time_(time), begin_(Clock::now()),
              match_(std::min(time.left_, Clock::duration(time.limits_.field) - spent)) {}
        Turn(Turn const&) = delete;
        Turn& operator=(Turn const&) = delete;
        ~Turn() { time_.left_ -= spent(); }

        /// Whether a pattern was ended.
        bool isUp() const { return match_.isUp(); }
        /// A clock that was set back has not given time back.
        Clock::duration spent() const { return std::max(Clock::now() - begin_, Clock::duration::zero()); }

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
