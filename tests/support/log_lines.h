#pragma once
// What is logged while it lives.

#include "vlservice/platform/log.h"

#include <ostream>
#include <string>
#include <utility>
#include <vector>

namespace VLServiceTest {

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
    std::vector<LogLine> lines;

    explicit LogLines(bool verbose = false)
        : verboseBefore_(std::exchange(g_LogVerbose, verbose)),
          sinkBefore_(Log::setSink([this](LogPriority priority, std::string const& text) {
              lines.push_back({priority, text});
          })) {}
    ~LogLines() {
        Log::setSink(std::move(sinkBefore_));
        g_LogVerbose = verboseBefore_;
    }
    LogLines(LogLines const&) = delete;
    LogLines& operator=(LogLines const&) = delete;

    /// The lines since the last call.
    std::vector<LogLine> take() { return std::exchange(lines, {}); }
    /// Each as "3 text".
    std::vector<std::string> texts() const {
        std::vector<std::string> texts;
        for (LogLine const& line : lines)
            texts.push_back(std::to_string(line.priority) + " " + line.text);
        return texts;
    }

private:
    bool verboseBefore_;
    Log::Sink sinkBefore_;
};

} // namespace VLServiceTest
