#include "tests/faults/process.h"

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <fstream>
#include <iterator>

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

namespace Faults {
namespace {

namespace fs = std::filesystem;

/// Of the clock, which goes on while a busy machine does other things.
constexpr int LATE_SECONDS = 120;

/// Children's ends are waited for and must not get lost meanwhile; `how` is SIG_BLOCK or SIG_UNBLOCK.
void holdChildSignals(int how) {
    sigset_t child;
    sigemptyset(&child);
    sigaddset(&child, SIGCHLD);
    ::sigprocmask(how, &child, nullptr);
}

std::string contentOf(fs::path const& file) {
    std::ifstream in(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
}

void writeInto(fs::path const& file, int descriptor) {
    int const opened = ::open(file.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
    ::dup2(opened, descriptor);
    ::close(opened);
}

[[noreturn]] void become(fs::path const& program, std::vector<std::string> arguments, fs::path const& folder,
                         std::map<std::string, std::string> const& environment) {
    holdChildSignals(SIG_UNBLOCK);
    // What is late is killed with all that has come of it.
    ::setpgid(0, 0);
    writeInto(folder.string() + ".out", STDOUT_FILENO);
    writeInto(folder.string() + ".err", STDERR_FILENO);
    for (auto const& [name, value] : environment)
        ::setenv(name.c_str(), value.c_str(), 1);
    arguments.insert(arguments.begin(), program.string());
    std::vector<char*> pointers;
    for (std::string& argument : arguments)
        pointers.push_back(argument.data());
    pointers.push_back(nullptr);
    if (::chdir(folder.c_str()) == 0)
        ::execv(program.c_str(), pointers.data());
    ::_exit(127);
}

/// False when the time is up.
bool awaitEnd(pid_t process, int& status) {
    sigset_t child;
    sigemptyset(&child);
    sigaddset(&child, SIGCHLD);
    timespec const limit{LATE_SECONDS, 0};
    while (::waitpid(process, &status, WNOHANG) == 0)
        if (::sigtimedwait(&child, nullptr, &limit) < 0 && errno == EAGAIN)
            return false;
    return true;
}

} // namespace

Ended runWith(Fault const& fault, fs::path const& program, std::vector<std::string> arguments,
              fs::path const& folder) {
    fs::path const counter = folder.string() + ".calls";
    auto const environment = environmentOf(fault, counter);
    holdChildSignals(SIG_BLOCK);
    pid_t const process = ::fork();
    if (process == 0)
        become(program, std::move(arguments), folder, environment);
    Ended ended;
    int status = 0;
    ended.isLate = !awaitEnd(process, status);
    // Workers that outlive a killed program go with it.
    ::kill(-process, SIGKILL);
    if (ended.isLate)
        ::waitpid(process, &status, 0);
    ended.status = WIFSIGNALED(status) ? -WTERMSIG(status) : WEXITSTATUS(status);
    ended.out = contentOf(folder.string() + ".out");
    ended.err = contentOf(folder.string() + ".err");
    ended.calls = callsIn(counter);
    return ended;
}

} // namespace Faults
