#include "vlservice/platform/log.h"

#include <algorithm>
#include <iostream>
#include <locale>
#include <mutex>
#include <sstream>
#include <utility>

bool g_LogVerbose = false;

namespace Log {
namespace {

void writeToStandardError(LogPriority priority, std::string const& line) {
    std::string text = '<' + std::to_string(priority) + '>' + line;
    // A text from outside must not look like a line of its own.
    std::replace_if(
        text.begin(), text.end(), [](char c) { return c == '\n' || c == '\r'; }, ' ');
    text += '\n';
    std::cerr.write(text.data(), static_cast<std::streamsize>(text.size())).flush();
}

struct Shared {
    // Recursive: a sink may log or replace itself.
    std::recursive_mutex mutex;
    Sink sink = writeToStandardError;
};

/// Never destroyed: static objects may log while the process ends.
Shared& shared() {
    static Shared& instance = *new Shared;
    return instance;
}

} // namespace

Sink setSink(Sink sink) {
    std::lock_guard const guard(shared().mutex);
    return std::exchange(shared().sink, std::move(sink));
}

Lock::Lock(LogPriority priority) noexcept : priority_(priority) { line_.imbue(std::locale::classic()); }

Lock::~Lock() {
    try {
        std::string text = std::move(line_).str();
        if (!text.empty() && text.back() == '\n')
            text.pop_back();
        std::lock_guard const guard(shared().mutex);
        if (Sink const sink = shared().sink)
            sink(priority_, text);
    } catch (...) {
        // Logging is the last resort: there is nowhere left to report to.
    }
}

std::ostream& Lock::logStreamLine() { return line_; }

} // namespace Log
