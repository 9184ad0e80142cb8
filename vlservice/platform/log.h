#pragma once
// Where the library's messages go: one line per Log::Lock, handed to a sink that the program may replace.

#include "vlservice/export.h"

#include <functional>
#include <ostream>
#include <sstream>
#include <string>

/// Trace lines (priority 7) are written only while this is set; false at start.
VLSERVICE_EXPORT extern bool g_LogVerbose;

namespace Log {

/// The journal's numbers: 3 and 4 are failures, 7 is a trace line.
using LogPriority = int;

using Sink = std::function<void(LogPriority, std::string const& line)>; ///< takes a line

/// Installs a sink and returns the one before. An empty sink drops all lines.
/// The sink at start writes to standard error, each line prefixed "<3>" and so on, which the journal
/// understands.
VLSERVICE_EXPORT Sink setSink(Sink sink);

/// One message: what is streamed in reaches the sink, in one call, when the object is destroyed, without its
/// final end of line. Numbers are written with the classic locale. Lines of several threads do not mix. A
/// line for which there is no memory is cut or dropped: a failure can be told from anywhere.
class VLSERVICE_EXPORT Lock {
public:
    Lock(LogPriority priority) noexcept; ///< begins a message
    ~Lock();
    Lock(Lock const&) = delete;
    Lock& operator=(Lock const&) = delete;

    std::ostream& logStreamLine(); ///< takes its text

private:
    LogPriority priority_;
    std::ostringstream line_;
};

} // namespace Log

using Log::LogPriority;
