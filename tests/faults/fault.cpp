#include "tests/faults/fault.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>

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
        return {{call, ENOMEM, 0, false}, {call, ENOMEM, 0, true}};
    if (call == "open")
        return {{call, EMFILE, 0, false}, {call, EACCES, 0, false}, killed};
    if (call == "send" || call == "receive")
        return {{call, ECONNRESET, 0, false}, killed};
    if (call == "start")
        return {{call, EAGAIN, 0, false}};
    return {{call, EIO, 0, false}, killed};
}

} // namespace Faults
