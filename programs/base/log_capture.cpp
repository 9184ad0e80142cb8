#include "programs/base/log_capture.h"

#include <utility>

namespace Base {

LogCapture::LogCapture()
    : before_(Log::setSink([this](LogPriority, std::string const& line) { lines_.push_back(line); })) {}

LogCapture::~LogCapture() { Log::setSink(std::move(before_)); }

} // namespace Base
