#include "tests/faults/fault.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <fstream>
#include <stdexcept>

namespace Faults {

std::vector<std::string> const CALLS{"write", "read",   "sync",    "rename", "remove",
                                     "open",  "memory", "receive", "send",   "start"};

std::string Fault::text() const {
    return call + ':' + std::to_string(error) + ':' + std::to_string(number) + (stays ? "+" : "");
}

std::optional<Fault> Fault::parse(std::string const& text) {
    char call[16] = "";
    char ending = 0;
    Fault fault;
    if (std::sscanf(text.c_str(), "%15[a-z]:%d:%ld%c", call, &fault.error, &fault.number, &ending) < 3)
        return std::nullopt;
    fault.call = call;
    fault.stays = ending == '+';
    bool const isKnown = std::ranges::find(CALLS, fault.call) != CALLS.end();
    return isKnown ? std::optional(fault) : std::nullopt;
}

std::vector<Fault> faultsOf(std::string const& call) {
    Fault const killed{call, 0, 0, false};
    if (call == "write")
        return {{call, ENOSPC, 0, true}, {call, EIO, 0, false}, killed};
    if (call == "memory")
        return {{call, ENOMEM, 0, false}, {call, ENOMEM, 0, true}, killed};
    if (call == "open")
        return {{call, EMFILE, 0, false}, {call, EACCES, 0, false}, killed};
    if (call == "send" || call == "receive")
        return {{call, ECONNRESET, 0, false}, killed};
    if (call == "start")
        return {{call, EAGAIN, 0, false}, killed};
    return {{call, EIO, 0, false}, killed};
}

std::map<std::string, std::string> environmentOf(Fault const& fault, std::filesystem::path const& counter) {
    // The loader goes on without a library that it does not find, and nothing would fail.
    if (!std::filesystem::exists(FAIL_AT_CALL_LIBRARY))
        throw std::runtime_error("there is no " FAIL_AT_CALL_LIBRARY);
    std::ofstream(counter, std::ios::binary) << std::string(sizeof(long), '\0');
    return {{"LD_PRELOAD", FAIL_AT_CALL_LIBRARY},
            {"FAULT", fault.text()},
            {"FAULT_CALLS", counter.string()},
            // The sanitizer would refuse to be behind another library.
            {"ASAN_OPTIONS", "verify_asan_link_order=0"}};
}

long callsIn(std::filesystem::path const& counter) {
    long calls = 0;
    std::ifstream(counter, std::ios::binary).read(reinterpret_cast<char*>(&calls), sizeof calls);
    return calls;
}

} // namespace Faults
