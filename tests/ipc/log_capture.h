#pragma once
// Collects what is logged while it lives.

#include "vlservice/platform/log.h"

#include <string>
#include <utility>
#include <vector>

class LogCapture {
public:
    using Line = std::pair<LogPriority, std::string>;
    std::vector<Line> lines;

    explicit LogCapture(bool verbose = false)
        : verboseBefore_(std::exchange(g_LogVerbose, verbose)),
          sinkBefore_(Log::setSink([this](LogPriority priority, std::string const& line) {
              lines.emplace_back(priority, line);
          })) {}
    ~LogCapture() {
        Log::setSink(std::move(sinkBefore_));
        g_LogVerbose = verboseBefore_;
    }
    LogCapture(LogCapture const&) = delete;
    LogCapture& operator=(LogCapture const&) = delete;

private:
    bool verboseBefore_;
    Log::Sink sinkBefore_;
};
