#pragma once
// What whole programs take.

#include <fcntl.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <stdexcept>
#include <string>
#include <vector>

namespace Bench {

inline double seconds(timeval const& time) {
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) / 1e6;
}

/// Of the processors, with all children of the program, whose output goes nowhere. Throws std::runtime_error
/// when it fails; a status of 2 is what vlmail tells of letters that cannot go out.
inline double secondsOf(std::vector<std::string> const& command) {
    std::vector<char*> arguments;
    for (std::string const& argument : command)
        arguments.push_back(const_cast<char*>(argument.c_str()));
    arguments.push_back(nullptr);
    posix_spawn_file_actions_t actions;
    ::posix_spawn_file_actions_init(&actions);
    ::posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
    pid_t child = 0;
    bool const isStarted =
        ::posix_spawn(&child, arguments.front(), &actions, nullptr, arguments.data(), environ) == 0;
    ::posix_spawn_file_actions_destroy(&actions);
    int status = 0;
    rusage used{};
    if (!isStarted || ::wait4(child, &status, 0, &used) != child || !WIFEXITED(status) ||
        WEXITSTATUS(status) == 1 || WEXITSTATUS(status) > 2)
        throw std::runtime_error("cannot run " + command.front());
    return seconds(used.ru_utime) + seconds(used.ru_stime);
}

} // namespace Bench
