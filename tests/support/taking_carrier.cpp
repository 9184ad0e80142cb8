#include "tests/support/taking_carrier.h"

#include <poll.h>
#include <sys/inotify.h>
#include <unistd.h>

#include <array>
#include <system_error>
#include <utility>
#include <vector>

namespace VLServiceTest {
namespace {

namespace fs = std::filesystem;

/// Names of files that were renamed into the folder, in that order; waits for a moment when there are none.
std::vector<std::string> namesFrom(int watch) {
    constexpr int A_MOMENT_MS = 100;
    pollfd at{watch, POLLIN, 0};
    std::vector<std::string> names;
    alignas(inotify_event) std::array<char, 65536> buffer;
    if (::poll(&at, 1, A_MOMENT_MS) <= 0)
        return names;
    ssize_t const size = ::read(watch, buffer.data(), buffer.size());
    for (ssize_t place = 0; place < size;) {
        auto const* const event = reinterpret_cast<inotify_event const*>(buffer.data() + place);
        if (event->len > 0)
            names.emplace_back(event->name);
        place += static_cast<ssize_t>(sizeof(inotify_event) + event->len);
    }
    return names;
}

} // namespace

TakingCarrier::TakingCarrier(fs::path folder, fs::path taken)
    : folder_(std::move(folder)), takenFolder_(std::move(taken)), watch_(::inotify_init1(IN_CLOEXEC)) {
    ::inotify_add_watch(watch_, folder_.c_str(), IN_MOVED_TO);
    thread_ = std::thread([this] { run(); });
}

TakingCarrier::~TakingCarrier() {
    isEnding_ = true;
    thread_.join();
    ::close(watch_);
}

std::map<std::string, int> TakingCarrier::taken() const {
    std::scoped_lock const lock(mutex_);
    return taken_;
}

void TakingCarrier::run() {
    while (!isEnding_)
        for (std::string const& name : namesFrom(watch_))
            take(name);
}

void TakingCarrier::take(std::string const& name) {
    if (name.starts_with('.'))
        return;
    // One that was replaced before is gone already.
    std::error_code gone;
    fs::rename(folder_ / name, takenFolder_ / name, gone);
    std::scoped_lock const lock(mutex_);
    ++taken_[name];
}

} // namespace VLServiceTest
