#include "programs/carriers/child_process.h"

#include "programs/base/error.h"
#include "programs/base/file_descriptor.h"

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdint>
#include <fcntl.h>
#include <grp.h>
#include <linux/close_range.h>
#include <poll.h>
#include <pwd.h>
#include <sys/mman.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <system_error>
#include <unistd.h>
#include <utility>

namespace Carriers {
namespace {

using Base::FileDescriptor;
using Clock = std::chrono::steady_clock;

[[noreturn]] void fail(std::string const& what, int error = errno) {
    throw std::system_error(error, std::generic_category(), what);
}

FileDescriptor fileWith(std::string_view bytes) {
    int const number = ::memfd_create("input", MFD_CLOEXEC);
    if (number < 0)
        fail("cannot hold what a program is to read");
    FileDescriptor file(number, "input");
    file.writeAll(bytes);
    ::lseek(file.number(), 0, SEEK_SET);
    return file;
}

std::pair<FileDescriptor, FileDescriptor> makePipe() {
    std::array<int, 2> ends{};
    if (::pipe2(ends.data(), O_CLOEXEC) != 0)
        fail("cannot make a pipe");
    return {FileDescriptor(ends[0], "pipe"), FileDescriptor(ends[1], "pipe")};
}

struct User {
    bool isOther = false;
    uid_t user = 0;
    gid_t group = 0;
};

User userNamed(std::string const& name) {
    if (name.empty())
        return {};
    std::array<char, 16384> buffer{};
    passwd entry{};
    passwd* found = nullptr;
    ::getpwnam_r(name.c_str(), &entry, buffer.data(), buffer.size(), &found);
    if (!found)
        throw Base::Error(Base::Code::SettingInvalid,
                          "there is no user " + name + " that a program could run as");
    return {found->pw_uid != ::geteuid(), found->pw_uid, found->pw_gid};
}

/// What the child does between fork() and the program, of which nothing may take memory or a lock.
struct Child {
    char const* program;
    char* const* arguments;
    char* const* environment;
    int input;
    int more;
    int output;
    int failure;
    User user;

    [[noreturn]] void become() const {
        ::setpgid(0, 0);
        bool const isReady = becomeUser() && placeFiles();
        if (isReady)
            ::execve(program, arguments, environment);
        int const error = errno;
        [[maybe_unused]] auto const written = ::write(failure, &error, sizeof error);
        ::_exit(127);
    }
    bool becomeUser() const {
        return !user.isOther ||
               (::setgroups(0, nullptr) == 0 && ::setgid(user.group) == 0 && ::setuid(user.user) == 0);
    }
    bool placeFiles() const {
        sigset_t none;
        ::sigemptyset(&none);
        ::sigprocmask(SIG_SETMASK, &none, nullptr);
        ::signal(SIGPIPE, SIG_DFL);
        int const nowhere = ::open("/dev/null", O_WRONLY | O_CLOEXEC);
        return ::dup2(input, 0) == 0 && ::dup2(output, 1) == 1 && ::dup2(nowhere, 2) == 2 &&
               ::dup2(more, 3) == 3 && ::close_range(4, ~0U, CLOSE_RANGE_CLOEXEC) == 0;
    }
};

/// High enough that placing the others replaces none of it.
FileDescriptor outOfTheWay(FileDescriptor const& file) {
    int const number = ::fcntl(file.number(), F_DUPFD_CLOEXEC, 10);
    if (number < 0)
        fail("cannot prepare a program's files");
    return {number, file.file()};
}

std::vector<char*> pointersTo(std::vector<std::string>& texts) {
    std::vector<char*> pointers;
    for (std::string& text : texts)
        pointers.push_back(text.data());
    pointers.push_back(nullptr);
    return pointers;
}

/// A process that is killed with its group unless it was seen to end.
class Process {
public:
    explicit Process(pid_t number) : number_(number) {}
    ~Process() {
        if (!isOver_)
            kill();
    }
    Process(Process const&) = delete;
    Process& operator=(Process const&) = delete;

    void kill() {
        ::kill(-number_, SIGKILL);
        ::kill(number_, SIGKILL);
        wait();
    }
    int wait() {
        int status = 0;
        while (::waitpid(number_, &status, 0) < 0 && errno == EINTR) {
        }
        isOver_ = true;
        return status;
    }
    FileDescriptor end() const {
        int const number = static_cast<int>(::syscall(SYS_pidfd_open, number_, 0));
        if (number < 0)
            fail("cannot wait for a program");
        return {number, "process"};
    }

private:
    pid_t number_;
    bool isOver_ = false;
};

pid_t startChild(Child const& child) {
    pid_t const number = ::fork();
    if (number < 0)
        fail("cannot start a program");
    if (number == 0)
        child.become();
    ::setpgid(number, number);
    return number;
}

/// What is there by now; false at the end of what it writes.
bool readMore(int from, std::string& output) {
    std::array<char, 4096> buffer{};
    ssize_t const size = ::read(from, buffer.data(), buffer.size());
    if (size > 0)
        output.append(buffer.data(), static_cast<std::size_t>(size));
    return size > 0 || (size < 0 && errno == EINTR);
}

bool isReadable(int file) {
    pollfd one{file, POLLIN, 0};
    return ::poll(&one, 1, 0) == 1 && (one.revents & (POLLIN | POLLHUP)) != 0;
}

/// Reads until the process ends or is beyond a limit.
ProgramEnd::Kind follow(ProgramToRun const& program, FileDescriptor const& output, int processEnd,
                        std::string& text) {
    auto const due = Clock::now() + program.timeLimit;
    bool isOpen = true;
    for (;;) {
        auto const left = std::chrono::ceil<std::chrono::milliseconds>(due - Clock::now()).count();
        std::array<pollfd, 2> waited{pollfd{processEnd, POLLIN, 0}, pollfd{output.number(), POLLIN, 0}};
        if (left <= 0 || ::poll(waited.data(), isOpen ? 2 : 1, static_cast<int>(left)) == 0)
            return ProgramEnd::Kind::OutOfTime;
        bool const isOver = waited[0].revents != 0;
        // What it has written by its end; others that it left behind may go on writing.
        do {
            if (isOpen && isReadable(output.number()))
                isOpen = readMore(output.number(), text);
            if (text.size() > program.outputLimit)
                return ProgramEnd::Kind::TooMuchOutput;
        } while (isOver && isOpen && isReadable(output.number()));
        if (isOver)
            return ProgramEnd::Kind::Exited;
    }
}

} // namespace

ProgramEnd run(ProgramToRun const& program, std::string_view input, std::string_view more) {
    std::vector<std::string> arguments{program.program};
    arguments.insert(arguments.end(), program.arguments.begin(), program.arguments.end());
    std::vector<std::string> environment{"PATH=/usr/local/bin:/usr/bin:/bin", "LANG=C.UTF-8"};
    std::vector<char*> const argumentPointers = pointersTo(arguments);
    std::vector<char*> const environmentPointers = pointersTo(environment);
    User const user = userNamed(program.user);
    FileDescriptor const inputFile = outOfTheWay(fileWith(input));
    FileDescriptor const moreFile = outOfTheWay(fileWith(more));
    auto [output, outputOfChild] = makePipe();
    auto [failure, failureOfChild] = makePipe();
    FileDescriptor writtenTo = outOfTheWay(outputOfChild);
    FileDescriptor toldTo = outOfTheWay(failureOfChild);
    Process process(
        startChild({program.program.c_str(), argumentPointers.data(), environmentPointers.data(),
                    inputFile.number(), moreFile.number(), writtenTo.number(), toldTo.number(), user}));
    for (FileDescriptor* const file : {&writtenTo, &toldTo, &outputOfChild, &failureOfChild})
        file->close();
    int error = 0;
    if (failure.read(&error, sizeof error) == sizeof error) {
        process.wait();
        fail("cannot start " + program.program, error);
    }
    ProgramEnd end;
    end.kind = follow(program, output, process.end().number(), end.output);
    if (end.kind != ProgramEnd::Kind::Exited) {
        process.kill();
        return end;
    }
    int const status = process.wait();
    end.kind = WIFEXITED(status) ? ProgramEnd::Kind::Exited : ProgramEnd::Kind::Killed;
    end.status = WIFEXITED(status) ? WEXITSTATUS(status) : 0;
    return end;
}

} // namespace Carriers
