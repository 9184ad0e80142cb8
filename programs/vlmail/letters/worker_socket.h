#pragma once
// Both ends of a worker's socket, as the worker uses them: waiting.

#include <cerrno>
#include <cstddef>
#include <sys/socket.h>
#include <unistd.h>

namespace VlMail {

/// False when the other side has gone.
inline bool writeAll(int file, void const* data, std::size_t size) {
    auto at = static_cast<char const*>(data);
    while (size > 0) {
        ssize_t const step = ::send(file, at, size, MSG_NOSIGNAL);
        if (step < 0 && errno == EINTR)
            continue;
        if (step <= 0)
            return false;
        at += step;
        size -= static_cast<std::size_t>(step);
    }
    return true;
}

inline bool readAll(int file, void* data, std::size_t size) {
    auto at = static_cast<char*>(data);
    while (size > 0) {
        ssize_t const step = ::read(file, at, size);
        if (step < 0 && errno == EINTR)
            continue;
        if (step <= 0)
            return false;
        at += step;
        size -= static_cast<std::size_t>(step);
    }
    return true;
}

} // namespace VlMail
