#pragma once
// A program that is run with limits.

#include <chrono>
#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace Carriers {

struct ProgramToRun {
    /// An absolute path.
    std::string program;
    std::vector<std::string> arguments;
    /// That it runs as; empty for the service's.
    std::string user;
    std::chrono::seconds timeLimit{};
    /// In bytes.
    std::size_t outputLimit = 0;
};

/// How a program has ended.
struct ProgramEnd {
    enum class Kind { Exited, Killed, OutOfTime, TooMuchOutput } kind = Kind::Exited;
    /// Where it exited.
    int status = 0;
    /// What it wrote to standard output, as far as it may.
    std::string output;
};

/// Runs a program with `input` as standard input and `more` as file descriptor 3, both of which it may read
/// at any place, and without the service's environment and files. Beyond a limit it is killed with its
/// process group. Throws Error, or std::system_error, when it cannot be started: nothing of it ran then.
ProgramEnd run(ProgramToRun const& program, std::string_view input, std::string_view more);

} // namespace Carriers
