// Loaded into a process ahead of the C library: kills the process, as kill -9 would, in front of the call of
// a given number among those that make something durable or visible. KILL_AT_CALL is that number, from 1.

#include <atomic>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <dlfcn.h>
#include <unistd.h>

namespace {

std::atomic<long> calls{0};

void countCall() {
    static long const last = [] {
        char const* const number = std::getenv("KILL_AT_CALL");
        return number ? std::atol(number) : 0;
    }();
    if (++calls == last)
        ::kill(::getpid(), SIGKILL);
}

template<typename Function>
Function original(char const* name) {
    return reinterpret_cast<Function>(::dlsym(RTLD_NEXT, name));
}

} // namespace

extern "C" {

__attribute__((visibility("default"))) int fsync(int) {
    countCall();
    return 0;
}

__attribute__((visibility("default"))) int fdatasync(int) {
    countCall();
    return 0;
}

__attribute__((visibility("default"))) int rename(char const* from, char const* to) noexcept {
    static auto const next = original<int (*)(char const*, char const*)>("rename");
    countCall();
    return next(from, to);
}

__attribute__((visibility("default"))) int unlink(char const* file) noexcept {
    static auto const next = original<int (*)(char const*)>("unlink");
    countCall();
    return next(file);
}

__attribute__((visibility("default"))) int remove(char const* file) noexcept {
    static auto const next = original<int (*)(char const*)>("remove");
    countCall();
    return next(file);
}

} // extern "C"
