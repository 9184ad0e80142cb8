// Loaded into a program ahead of the C library: the call of a given number in a class of calls fails, or the
// process is killed in front of it as kill -9 would. Calls count from the beginning of main to its end, over
// all processes that come of it. The environment says which:
//     FAULT        CLASS:ERROR:NUMBER, such as write:28:3; the error 0 kills; a "+" behind it fails all
//                  later ones too. The class "durable" is all that make something durable or visible.
//     FAULT_CALLS  a file of 8 bytes, where the calls of the class are counted
//     FAULT_SERVER a socket, at which runs are asked for that begin at main(); see serve_forks.cpp
// Syncing does nothing else: a process that is killed leaves what it wrote to the system.

#include "tests/faults/serve_forks.h"

#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include <dlfcn.h>
#include <fcntl.h>
#include <sys/mman.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/uio.h>
#include <unistd.h>

#define EXPORTED __attribute__((visibility("default")))

// The C library's own names.
// NOLINTBEGIN(bugprone-reserved-identifier)
extern "C" {
void* __libc_malloc(std::size_t size);
void* __libc_calloc(std::size_t count, std::size_t size);
void* __libc_realloc(void* block, std::size_t size);
void* __libc_memalign(std::size_t alignment, std::size_t size);
}
// NOLINTEND(bugprone-reserved-identifier)

namespace {

struct Fault {
    char call[16] = "";
    int error = 0;
    long number = 0;
    bool stays = false;
    /// Shared with whatever the process becomes or starts.
    std::atomic<long>* calls = nullptr;
};

Fault fault;
std::atomic<bool> isCounting = false;

std::atomic<long>* countersIn(char const* file) {
    int const descriptor = file ? static_cast<int>(::syscall(SYS_openat, AT_FDCWD, file, O_RDWR)) : -1;
    void* const memory =
        descriptor < 0 ? MAP_FAILED
                       : ::mmap(nullptr, sizeof(long), PROT_READ | PROT_WRITE, MAP_SHARED, descriptor, 0);
    if (descriptor >= 0)
        ::close(descriptor);
    return memory == MAP_FAILED ? nullptr : static_cast<std::atomic<long>*>(memory);
}

void readFault() {
    char const* const text = std::getenv("FAULT");
    char ending = 0;
    if (!text || std::sscanf(text, "%15[a-z]:%d:%ld%c", fault.call, &fault.error, &fault.number, &ending) < 3)
        return;
    fault.stays = ending == '+';
    fault.calls = countersIn(std::getenv("FAULT_CALLS"));
}

bool isOfFault(char const* call) {
    if (std::strcmp(fault.call, "durable") != 0)
        return std::strcmp(call, fault.call) == 0;
    return std::strcmp(call, "sync") == 0 || std::strcmp(call, "rename") == 0 ||
           std::strcmp(call, "remove") == 0;
}

/// Whether this call of the class is to fail; errno says how then.
bool fails(char const* call) {
    if (!isCounting || !fault.calls || !isOfFault(call))
        return false;
    long const number = ++*fault.calls;
    if (fault.number == 0 || number < fault.number || (number > fault.number && !fault.stays))
        return false;
    if (fault.error == 0)
        ::kill(::getpid(), SIGKILL);
    errno = fault.error;
    return true;
}

/// What a disk does to reading and writing happens to files alone. A pipe within a process does not fail:
/// what comes by it, such as a signal, would be lost.
bool isFile(int descriptor) {
    struct stat status {};
    return ::fstat(descriptor, &status) == 0 && S_ISREG(status.st_mode);
}

template<typename Function>
Function original(Function /* for its type */, char const* name) {
    return reinterpret_cast<Function>(::dlsym(RTLD_NEXT, name));
}

using Main = int (*)(int, char**, char**);
Main programMain;

int countingMain(int argc, char** argv, char** /* may grow */) {
    Arguments arguments{argc, argv};
    if (int const socket = serverSocket(); socket >= 0)
        arguments = serveForks(socket, argv[0]);
    readFault();
    isCounting = true;
    int const status = programMain(arguments.count, arguments.words, environ);
    isCounting = false;
    return status;
}

} // namespace

// The parameters come in parentheses of their own. NOLINTBEGIN(bugprone-macro-parentheses)
// Defines a function of the C library that fails with -1, where the condition holds, or gives what the
// library's own gives.
#define FAILING_IF(condition, Class, Result, name, parameters, arguments)                                    \
    EXPORTED Result name parameters {                                                                        \
        static auto const next = original(static_cast<Result(*) parameters>(nullptr), #name);                \
        return (condition) && fails(#Class) ? Result(-1) : next arguments;                                   \
    }
#define FAILING(Class, Result, name, parameters, arguments)                                                  \
    FAILING_IF(true, Class, Result, name, parameters, arguments)
// NOLINTEND(bugprone-macro-parentheses)

extern "C" {

// NOLINTNEXTLINE(bugprone-reserved-identifier)
EXPORTED int __libc_start_main(Main main, int argc, char** argv, void (*init)(), void (*fini)(),
                               void (*end)(), void* stack) {
    using Start = int (*)(Main, int, char**, void (*)(), void (*)(), void (*)(), void*);
    programMain = main;
    return original(Start(nullptr), "__libc_start_main")(countingMain, argc, argv, init, fini, end, stack);
}

FAILING_IF(isFile(file), write, ssize_t, write, (int file, void const* data, size_t size), (file, data, size))
FAILING_IF(isFile(file), write, ssize_t, writev, (int file, iovec const* parts, int count),
           (file, parts, count))
FAILING_IF(isFile(file), write, ssize_t, pwrite, (int file, void const* data, size_t size, off_t at),
           (file, data, size, at))
FAILING_IF(isFile(file), write, ssize_t, pwrite64, (int file, void const* data, size_t size, off64_t at),
           (file, data, size, at))
FAILING_IF(isFile(file), write, int, ftruncate, (int file, off_t size), (file, size))
FAILING_IF(isFile(file), write, int, ftruncate64, (int file, off64_t size), (file, size))

FAILING_IF(isFile(file), read, ssize_t, read, (int file, void* data, size_t size), (file, data, size))
FAILING_IF(isFile(file), read, ssize_t, readv, (int file, iovec const* parts, int count),
           (file, parts, count))
FAILING_IF(isFile(file), read, ssize_t, pread, (int file, void* data, size_t size, off_t at),
           (file, data, size, at))
FAILING_IF(isFile(file), read, ssize_t, pread64, (int file, void* data, size_t size, off64_t at),
           (file, data, size, at))

EXPORTED int fsync(int) { return fails("sync") ? -1 : 0; }
EXPORTED int fdatasync(int) { return fails("sync") ? -1 : 0; }

FAILING(rename, int, rename, (char const* from, char const* to), (from, to))
FAILING(rename, int, renameat, (int a, char const* from, int b, char const* to), (a, from, b, to))
FAILING(rename, int, link, (char const* from, char const* to), (from, to))
FAILING(remove, int, unlink, (char const* file), (file))
FAILING(remove, int, unlinkat, (int folder, char const* file, int flags), (folder, file, flags))
FAILING(remove, int, remove, (char const* file), (file))
FAILING(remove, int, rmdir, (char const* folder), (folder))

FAILING(send, ssize_t, send, (int peer, void const* data, size_t size, int flags), (peer, data, size, flags))
FAILING(send, ssize_t, sendmsg, (int peer, msghdr const* message, int flags), (peer, message, flags))
FAILING(receive, ssize_t, recv, (int peer, void* data, size_t size, int flags), (peer, data, size, flags))
FAILING(receive, ssize_t, recvmsg, (int peer, msghdr* message, int flags), (peer, message, flags))

FAILING(open, int, mkstemp, (char* name), (name))
FAILING(open, int, mkstemps, (char* name, int ending), (name, ending))
FAILING(open, int, mkostemps, (char* name, int ending, int flags), (name, ending, flags))
FAILING(open, int, mkdir, (char const* name, mode_t mode), (name, mode))
FAILING(start, int, pipe, (int ends[2]), (ends))
FAILING(start, int, pipe2, (int ends[2], int flags), (ends, flags))
FAILING(start, int, socketpair, (int family, int type, int protocol, int ends[2]),
        (family, type, protocol, ends))
FAILING(start, pid_t, fork, (), ())

#define FAILING_OPEN(name)                                                                                   \
    EXPORTED int name(char const* file, int flags, ...) {                                                    \
        static auto const next = original(static_cast<int (*)(char const*, int, ...)>(nullptr), #name);      \
        va_list more;                                                                                        \
        va_start(more, flags);                                                                               \
        int const mode = va_arg(more, int);                                                                  \
        va_end(more);                                                                                        \
        return fails("open") ? -1 : next(file, flags, mode);                                                 \
    }
#define FAILING_OPENAT(name)                                                                                 \
    EXPORTED int name(int folder, char const* file, int flags, ...) {                                        \
        static auto const next = original(static_cast<int (*)(int, char const*, int, ...)>(nullptr), #name); \
        va_list more;                                                                                        \
        va_start(more, flags);                                                                               \
        int const mode = va_arg(more, int);                                                                  \
        va_end(more);                                                                                        \
        return fails("open") ? -1 : next(folder, file, flags, mode);                                         \
    }
#define FAILING_FOPEN(name)                                                                                  \
    EXPORTED FILE* name(char const* file, char const* mode) {                                                \
        static auto const next = original(static_cast<FILE* (*)(char const*, char const*)>(nullptr), #name); \
        return fails("open") ? nullptr : next(file, mode);                                                   \
    }
FAILING_OPEN(open)
FAILING_OPEN(open64)
FAILING_OPENAT(openat)
FAILING_OPENAT(openat64)
FAILING_FOPEN(fopen)
FAILING_FOPEN(fopen64)

#ifndef WITHOUT_MEMORY
EXPORTED void* malloc(std::size_t size) { return fails("memory") ? nullptr : __libc_malloc(size); }
EXPORTED void* calloc(std::size_t count, std::size_t size) {
    return fails("memory") ? nullptr : __libc_calloc(count, size);
}
EXPORTED void* realloc(void* block, std::size_t size) {
    return fails("memory") ? nullptr : __libc_realloc(block, size);
}
EXPORTED void* aligned_alloc(std::size_t alignment, std::size_t size) {
    return fails("memory") ? nullptr : __libc_memalign(alignment, size);
}
#endif

} // extern "C"
