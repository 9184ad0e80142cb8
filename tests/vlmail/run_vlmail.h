#pragma once
// Commands of vlmail in tests, run as a person runs them.

#include "programs/vlmail/commands/command.h"

#include <sstream>
#include <string>
#include <vector>

struct Ran {
    int status;
    std::string out;
    std::string err;
};

inline Ran runVlMail(std::vector<std::string> const& arguments) {
    std::vector<char const*> argv{"vlmail"};
    for (std::string const& argument : arguments)
        argv.push_back(argument.c_str());
    std::ostringstream out;
    std::ostringstream err;
    int const status = VlMail::run(static_cast<int>(argv.size()), argv.data(), {out, err});
    return {status, out.str(), err.str()};
}
