#pragma once
// What the library says, kept from people's terminals while somebody says it in better words.

#include "vlservice/platform/log.h"

#include <string>
#include <vector>

namespace Base {

/// Keeps the library's lines from being written, as long as it lives. Nobody decides by them: what failed is
/// told by what was called.
class LogCapture {
public:
    LogCapture();
    ~LogCapture();
    LogCapture(LogCapture const&) = delete;
    LogCapture& operator=(LogCapture const&) = delete;

    std::vector<std::string> const& lines() const { return lines_; }

private:
    std::vector<std::string> lines_;
    Log::Sink before_;
};

} // namespace Base
