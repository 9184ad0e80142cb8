#include "tests/faults/process.h"

#include "tests/faults/fork_server.h"
#include "tests/faults/patience.h"

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <optional>
#include <system_error>
#include <utility>

#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

namespace Faults {
namespace {

namespace fs = std::filesystem;

/// A file without a name, which a program writes to as to any other.
class Output {
public:
    Output() : file_(::memfd_create("output", MFD_CLOEXEC)) {
        if (file_ < 0)
            throw std::system_error(errno, std::generic_category(), "no file for output");
    }
    ~Output() { ::close(file_); }
    Output(Output const&) = delete;
    Output& operator=(Output const&) = delete;

    int file() const { return file_; }
    std::string content() const {
        struct stat status {};
        ::fstat(file_, &status);
        std::string text(static_cast<std::size_t>(status.st_size), '\0');
        text.resize(
            static_cast<std::size_t>(std::max(ssize_t(0), ::pread(file_, text.data(), text.size(), 0))));
        return text;
    }

private:
    int file_;
};

/// Nothing when it is late.
std::optional<int> awaitEnd(ForkServer& server, std::chrono::milliseconds limit) {
    using Clock = std::chrono::steady_clock;
    Patience patience(limit);
    std::chrono::milliseconds const look = std::min(limit, std::chrono::milliseconds(1000));
    auto before = Clock::now();
    for (std::chrono::nanoseconds starvedBefore{0}; !patience.isOver();) {
        if (auto const waited = server.awaitEnd(look))
            return waited;
        auto const now = Clock::now();
        auto const starved = starvedTimeOf(::getpid());
        patience.pass(now - std::exchange(before, now), starved - std::exchange(starvedBefore, starved));
    }
    return std::nullopt;
}

} // namespace

std::optional<int> awaitEndOrKill(ForkServer& server, pid_t process, std::chrono::milliseconds limit) {
    std::optional<int> const waited = awaitEnd(server, limit);
    // Workers may outlive a program that was killed.
    ::kill(-process, SIGKILL);
    if (!waited)
        server.awaitKilled();
    return waited;
}

Ended runWith(Fault const& fault, fs::path const& program, std::vector<std::string> arguments,
              Place const& place, std::chrono::milliseconds limit) {
    fs::path const counter = place.folder.string() + ".calls";
    auto environment = environmentOf(fault, counter);
    environment.insert(place.environment.begin(), place.environment.end());
    Output const out;
    Output const err;
    ForkServer& server = ForkServer::of(program);
    pid_t const process =
        server.start({place.folder, std::move(environment), std::move(arguments), out.file(), err.file()});
    std::optional<int> const waited = awaitEndOrKill(server, process, limit);
    Ended ended;
    ended.isLate = !waited;
    ended.status = statusIn(waited.value_or(SIGKILL));
    ended.out = out.content();
    ended.err = err.content();
    ended.calls = callsIn(counter);
    return ended;
}

} // namespace Faults
