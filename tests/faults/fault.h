#pragma once
// A call that fails: which, how, and from when on.

#include <filesystem>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace Faults {

/// The kinds of calls that can be made to fail, as fail_at_call.cpp names them, each once.
extern std::vector<std::string> const CALLS;

struct Fault {
    std::string call;
    /// As errno has it; 0 kills the process.
    int error = 0;
    /// The first call is 1; with 0 nothing fails.
    long number = 0;
    /// Whether all later calls fail too, as they do on a full disk.
    bool stays = false;

    /// As FAULT in the environment and on the command line of scripts/torture: "write:28:3", "write:28:3+".
    std::string text() const;
    static std::optional<Fault> parse(std::string const& text);

    bool kills() const { return error == 0; }
};

/// What calls of a kind can fail with, among them that the process is killed.
std::vector<Fault> faultsOf(std::string const& call);

/// The environment of a program in which that call fails. The counter is a file that is made anew.
std::map<std::string, std::string> environmentOf(Fault const& fault, std::filesystem::path const& counter);
long callsIn(std::filesystem::path const& counter);

} // namespace Faults
