#pragma once
// Collects what is logged while it lives.

#include "vlservice/platform/log.h"

#include <ostream>
#include <string>
#include <utility>
#include <vector>

struct LogLine {
    LogPriority priority;
    std::string text;

    bool operator==(LogLine const&) const = default;
    friend std::ostream& operator<<(std::ostream& out, LogLine const& line) {
        return out << '<' << line.priority << '>' << line.text;
    }
};

class LogLines {
public:
    LogLines() {
        before_ = Log::setSink([this](LogPriority priority, std::string const& text) {
            lines_.push_back({priority, text});
        });
    }
    ~LogLines() { Log::setSink(before_); }
    LogLines(LogLines const&) = delete;
    LogLines& operator=(LogLines const&) = delete;

    /// The lines since the last call.
    std::vector<LogLine> take() { return std::exchange(lines_, {}); }

private:
    std::vector<LogLine> lines_;
    Log::Sink before_;
};
