#pragma once
// An input as a file that lives in memory, for targets that open files.

#include <cstdint>
#include <cstdlib>
#include <string>
#include <sys/mman.h>
#include <unistd.h>

class MemoryFile {
public:
    MemoryFile(std::uint8_t const* data, std::size_t size) : number_(::memfd_create("input", 0)) {
        if (number_ < 0 || ::write(number_, data, size) != static_cast<ssize_t>(size))
            std::abort();
    }
    ~MemoryFile() { ::close(number_); }
    MemoryFile(MemoryFile const&) = delete;
    MemoryFile& operator=(MemoryFile const&) = delete;

    std::string path() const { return "/proc/self/fd/" + std::to_string(number_); }

private:
    int number_;
};
