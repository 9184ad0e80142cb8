#pragma once
// A program that is linked once and begun many times, with the library that fails calls in it.

#include <chrono>
#include <filesystem>
#include <map>
#include <optional>
#include <string>
#include <sys/types.h>
#include <vector>

namespace Faults {

/// How a process is begun.
struct Start {
    std::filesystem::path folder;
    std::map<std::string, std::string> environment;
    std::vector<std::string> arguments;
    /// Open files for standard output and error; they stay the caller's.
    int out = -1;
    int err = -1;
};

/// One process at a time. Failures to begin one are std::system_error.
class ForkServer {
public:
    explicit ForkServer(std::filesystem::path const& program);
    ~ForkServer();
    ForkServer(ForkServer const&) = delete;
    ForkServer& operator=(ForkServer const&) = delete;

    /// That of a program, which lives as long as this process.
    static ForkServer& of(std::filesystem::path const& program);

    pid_t start(Start const& start) const;
    /// What waitpid() says of the process that was started last; nothing when the time was up before.
    std::optional<int> awaitEnd(std::chrono::milliseconds time);
    /// The same of one that was killed.
    int awaitKilled() { return *awaitEnd(std::chrono::milliseconds(-1)); }

private:
    int socket_ = -1;
    pid_t process_ = -1;
};

/// The exit status in what waitpid() said, or minus the number of the signal.
int statusIn(int waited);

} // namespace Faults
