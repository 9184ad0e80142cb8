#include "programs/base/plain_log.h"

#include "programs/base/plain_text.h"

#include <utility>

namespace Base {

PlainLog::PlainLog() : before_(Log::setSink({})) {
    Log::setSink([this](LogPriority priority, std::string const& line) {
        if (before_)
            before_(priority, plainLine(line));
    });
}

PlainLog::~PlainLog() { Log::setSink(std::move(before_)); }

} // namespace Base
