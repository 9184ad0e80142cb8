// Linking a program takes longer than most of its runs do. Held in front of main(), it is forked for each
// run.
//
// A request is one packet of strings, each with a zero behind it, and two files for standard output and
// error:
//     folder to run in, any NAME=VALUE, an empty string, the arguments behind the program's name
// It is answered with the process id and, in the end, with what waitpid() says of it, a packet each.
#include "tests/faults/serve_forks.h"

#include <csignal>
#include <cstdlib>
#include <cstring>

#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

namespace {

constexpr int MAX_WORDS = 256;

char packet[1 << 16];
char* words[MAX_WORDS];

struct Files {
    int out = -1;
    int err = -1;
};

Files filesIn(msghdr& message) {
    Files files;
    if (cmsghdr const* const head = CMSG_FIRSTHDR(&message))
        std::memcpy(&files, CMSG_DATA(head), sizeof files);
    return files;
}

/// Ends the process when there are no more.
Files awaitRequest(int socket) {
    alignas(cmsghdr) char control[CMSG_SPACE(sizeof(Files))];
    iovec whole{packet, sizeof packet};
    msghdr message{};
    message.msg_iov = &whole;
    message.msg_iovlen = 1;
    message.msg_control = control;
    message.msg_controllen = sizeof control;
    if (::recvmsg(socket, &message, MSG_CMSG_CLOEXEC) <= 0)
        ::_exit(EXIT_SUCCESS);
    return filesIn(message);
}

char* behind(char* word) { return word + std::strlen(word) + 1; }

Arguments takeRequest(char* program) {
    bool const isThere = ::chdir(packet) == 0;
    // Programs that it becomes or starts run as they are.
    ::unsetenv("FAULT_SERVER");
    char* word = behind(packet);
    for (; *word != '\0'; word = behind(word))
        ::putenv(word);
    int count = 0;
    words[count++] = program;
    for (word = behind(word); *word != '\0' && count + 1 < MAX_WORDS; word = behind(word))
        words[count++] = word;
    if (!isThere)
        ::_exit(EXIT_FAILURE);
    return {count, words};
}

void becomeItsOwn(pid_t parent, Files files) {
    // Who is late is ended with all that has come of it, and nobody outlives the server.
    ::setpgid(0, 0);
    ::prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (::getppid() != parent)
        ::_exit(EXIT_FAILURE);
    ::dup2(files.out, STDOUT_FILENO);
    ::dup2(files.err, STDERR_FILENO);
    ::close(files.out);
    ::close(files.err);
}

template<typename Value>
void answer(int socket, Value value) {
    if (::send(socket, &value, sizeof value, MSG_NOSIGNAL) != sizeof value)
        ::_exit(EXIT_FAILURE);
}

void tellEnd(int socket, pid_t process) {
    int status = 0;
    if (process > 0)
        ::waitpid(process, &status, 0);
    answer(socket, status);
}

} // namespace

int serverSocket() {
    char const* const number = std::getenv("FAULT_SERVER");
    return number ? std::atoi(number) : -1;
}

Arguments serveForks(int socket, char* program) {
    pid_t const server = ::getpid();
    for (;;) {
        std::memset(packet, 0, sizeof packet);
        Files const files = awaitRequest(socket);
        pid_t const process = ::fork();
        if (process == 0) {
            ::close(socket);
            becomeItsOwn(server, files);
            return takeRequest(program);
        }
        ::close(files.out);
        ::close(files.err);
        answer(socket, process);
        tellEnd(socket, process);
    }
}
