#pragma once
// The log as people may read it.

#include "vlservice/platform/log.h"

namespace Base {

/// As long as it lives, lines reach the sink that was there before as plainLine(): what a document, a
/// mailing or a stranger on the network is called stands in them.
class PlainLog {
public:
    PlainLog();
    ~PlainLog();
    PlainLog(PlainLog const&) = delete;
    PlainLog& operator=(PlainLog const&) = delete;

private:
    Log::Sink before_;
};

} // namespace Base
