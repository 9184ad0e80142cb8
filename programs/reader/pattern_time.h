#pragma once
// How long the patterns of a document may take, together and each.

#include "vlservice/extract/match_time.h"

#include <algorithm>
#include <chrono>
#include <string>

namespace Reader {

/// Such as "2 s" and "0.050 s".
inline std::string inSeconds(std::chrono::milliseconds time) {
    std::string const rest = std::to_string(1000 + time.count() % 1000).substr(1);
    return std::to_string(time.count() / 1000) + (rest == "000" ? "" : '.' + rest) + " s";
}

struct PatternLimits {
    std::chrono::milliseconds field{2'000};
    std::chrono::milliseconds document{20'000};
};

/// What is left for a document.
class PatternTime {
public:
    using Clock = std::chrono::steady_clock;

    /// `now` is the clock.
    explicit PatternTime(PatternLimits const& limits = {}, Clock::time_point (*now)() = &Clock::now)
        : limits_(limits), now_(now), left_(limits.document) {}

    /// The patterns of one field, which end in time. A field that has more than one turn has `spent` some of
    /// its time before.
    class Turn {
    public:
        explicit Turn(PatternTime& time, Clock::duration spent = {})
            : time_(time), begin_(time.now_()),
              match_(std::min(time.left_, Clock::duration(time.limits_.field) - spent)) {}
        Turn(Turn const&) = delete;
        Turn& operator=(Turn const&) = delete;
        ~Turn() { time_.left_ -= spent(); }

        /// Whether a pattern was ended.
        bool isUp() const { return match_.isUp(); }
        /// A clock that was set back has not given time back.
        Clock::duration spent() const { return std::max(time_.now_() - begin_, Clock::duration::zero()); }

    private:
        PatternTime& time_;
        Clock::time_point begin_;
        Cfg::MatchTime match_;
    };

    /// As of the last turn's end.
    Clock::duration left() const { return left_; }
    bool isUp() const { return left_ <= Clock::duration::zero(); }
    PatternLimits const& limits() const { return limits_; }

private:
    PatternLimits limits_;
    Clock::time_point (*now_)();
    Clock::duration left_;
};

} // namespace Reader
