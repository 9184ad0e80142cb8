#pragma once
// Makes the operating system refuse what tests want refused, without rights and without touching other
// threads.

#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/syscall.h>

#include <cerrno>
#include <cstddef>
#include <initializer_list>
#include <system_error>
#include <thread>
#include <vector>

namespace detail {

/// From here on these calls fail on this thread.
inline void refuse(std::initializer_list<int> calls, int error) {
    std::vector<sock_filter> program{BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr))};
    for (int const call : calls) {
        program.push_back(BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, static_cast<unsigned>(call), 0, 1));
        program.push_back(BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | static_cast<unsigned>(error)));
    }
    program.push_back(BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW));
    sock_fprog const filter{static_cast<unsigned short>(program.size()), program.data()};
    if (prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) != 0 ||
        prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &filter) != 0)
        throw std::system_error(errno, std::generic_category(), "seccomp");
}

} // namespace detail

/// Does the work on a thread on which these system calls fail with that error.
template<typename Work>
void whileRefused(std::initializer_list<int> calls, int error, Work work) {
    std::thread([&] {
        detail::refuse(calls, error);
        work();
    }).join();
}
