#include "tests/faults/fork_server.h"

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <stdexcept>
#include <system_error>

#include <poll.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

namespace Faults {
namespace {

namespace fs = std::filesystem;

[[noreturn]] void fail(char const* what) { throw std::system_error(errno, std::generic_category(), what); }

[[noreturn]] void becomeServer(fs::path const& program, int socket) {
    int const kept = ::dup(socket);
    ::setenv("LD_PRELOAD", FAIL_AT_CALL_LIBRARY, 1);
    ::setenv("FAULT_SERVER", std::to_string(kept).c_str(), 1);
    // The sanitizer would refuse to be behind another library.
    ::setenv("ASAN_OPTIONS", "verify_asan_link_order=0", 1);
    ::execl(program.c_str(), program.c_str(), nullptr);
    ::_exit(127);
}

/// As serve_forks.cpp describes it.
std::string packetOf(Start const& start) {
    std::string packet = start.folder.string() + '\0';
    for (auto const& [name, value] : start.environment)
        packet += name + '=' + value + '\0';
    packet += '\0';
    for (std::string const& argument : start.arguments)
        packet += argument + '\0';
    return packet;
}

void sendWithFiles(int socket, std::string packet, int out, int err) {
    int const files[]{out, err};
    alignas(cmsghdr) char control[CMSG_SPACE(sizeof files)]{};
    iovec whole{packet.data(), packet.size()};
    msghdr message{};
    message.msg_iov = &whole;
    message.msg_iovlen = 1;
    message.msg_control = control;
    message.msg_controllen = sizeof control;
    cmsghdr* const head = CMSG_FIRSTHDR(&message);
    head->cmsg_level = SOL_SOCKET;
    head->cmsg_type = SCM_RIGHTS;
    head->cmsg_len = CMSG_LEN(sizeof files);
    std::memcpy(CMSG_DATA(head), files, sizeof files);
    if (::sendmsg(socket, &message, MSG_NOSIGNAL) < 0 && errno != EPIPE)
        fail("cannot ask for a process");
}

template<typename Value>
Value answerAt(int socket, pid_t server) {
    Value value{};
    if (::recv(socket, &value, sizeof value, 0) == sizeof value)
        return value;
    int status = 0;
    ::waitpid(server, &status, 0);
    throw std::runtime_error("the program that is to be forked has ended with " +
                             std::to_string(statusIn(status)));
}

} // namespace

ForkServer::ForkServer(fs::path const& program) {
    // The loader goes on without a library that it does not find, and nothing would fail.
    if (!fs::exists(FAIL_AT_CALL_LIBRARY))
        fail("there is no " FAIL_AT_CALL_LIBRARY);
    int ends[2];
    if (::socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, ends) != 0)
        fail("cannot connect to a program");
    process_ = ::fork();
    if (process_ == 0)
        becomeServer(program, ends[1]);
    ::close(ends[1]);
    socket_ = ends[0];
}

ForkServer::~ForkServer() {
    ::close(socket_);
    // In the middle of a run it does not listen.
    ::kill(process_, SIGKILL);
    ::waitpid(process_, nullptr, 0);
}

ForkServer& ForkServer::of(fs::path const& program) {
    static std::map<fs::path, std::unique_ptr<ForkServer>> servers;
    std::unique_ptr<ForkServer>& server = servers[program];
    if (!server)
        server = std::make_unique<ForkServer>(program);
    return *server;
}

pid_t ForkServer::start(Start const& start) const {
    sendWithFiles(socket_, packetOf(start), start.out, start.err);
    auto const process = answerAt<pid_t>(socket_, process_);
    if (process < 0)
        fail("cannot begin a process");
    return process;
}

std::optional<int> ForkServer::awaitEnd(std::chrono::milliseconds time) {
    pollfd polled{socket_, POLLIN, 0};
    if (::poll(&polled, 1, static_cast<int>(time.count())) <= 0)
        return std::nullopt;
    return answerAt<int>(socket_, process_);
}

int statusIn(int waited) { return WIFSIGNALED(waited) ? -WTERMSIG(waited) : WEXITSTATUS(waited); }

} // namespace Faults
