#include "tests/chaos/client_run.h"

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <fstream>
#include <iterator>

namespace Chaos {
namespace {

namespace fs = std::filesystem;

constexpr int PATIENCE_MS = 150'000;

std::string contentOfFile(fs::path const& file) {
    std::ifstream in(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
}

/// Files for what a program says.
class Said {
public:
    explicit Said(fs::path const& folder) : out_(newFile(folder)), err_(newFile(folder)) {
        ::posix_spawn_file_actions_init(&actions_);
        ::posix_spawn_file_actions_addopen(&actions_, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
        ::posix_spawn_file_actions_addopen(&actions_, STDOUT_FILENO, out_.c_str(), O_WRONLY, 0);
        ::posix_spawn_file_actions_addopen(&actions_, STDERR_FILENO, err_.c_str(), O_WRONLY, 0);
    }
    ~Said() {
        ::posix_spawn_file_actions_destroy(&actions_);
        fs::remove(out_);
        fs::remove(err_);
    }
    Said(Said const&) = delete;
    Said& operator=(Said const&) = delete;

    posix_spawn_file_actions_t const& actions() const { return actions_; }
    std::string out() const { return contentOfFile(out_); }
    std::string err() const { return contentOfFile(err_); }

private:
    static fs::path newFile(fs::path const& folder) {
        std::string name = (folder / "said.XXXXXX").string();
        ::close(::mkostemp(name.data(), O_CLOEXEC));
        return name;
    }

    fs::path out_;
    fs::path err_;
    posix_spawn_file_actions_t actions_{};
};

/// As an exit status, or minus the number of the signal that ended it.
int awaitEnd(pid_t process) {
    int const handle = static_cast<int>(::syscall(SYS_pidfd_open, process, 0));
    pollfd at{handle, POLLIN, 0};
    if (::poll(&at, 1, PATIENCE_MS) == 0)
        ::kill(process, SIGKILL);
    ::close(handle);
    int status = 0;
    ::waitpid(process, &status, 0);
    return WIFSIGNALED(status) ? -WTERMSIG(status) : WEXITSTATUS(status);
}

} // namespace

ClientRun runClient(fs::path const& folder, std::vector<std::string> arguments) {
    arguments.insert(arguments.begin(), VLMAIL_PROGRAM);
    std::vector<char*> pointers;
    for (std::string& argument : arguments)
        pointers.push_back(argument.data());
    pointers.push_back(nullptr);
    Said const said(folder);
    pid_t process = -1;
    if (::posix_spawn(&process, VLMAIL_PROGRAM, &said.actions(), nullptr, pointers.data(), environ) != 0)
        return {-1, {}, "vlmail could not be started"};
    int const status = awaitEnd(process);
    return {status, said.out(), said.err()};
}

} // namespace Chaos
