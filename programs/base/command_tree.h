#pragma once
// What a program's command line knows of itself, for manual pages and the completion of shells.

#include <string>
#include <vector>

namespace Base {

struct OptionInfo {
    /// With their dashes, the short one first; a single name without any for what is told by its place.
    std::vector<std::string> names;
    /// What the help calls its value; empty for a flag.
    std::string value;
    std::string help;
    /// What it is when it is not given, where the help shows that.
    std::string standard = {};
    bool isRequired = false;
    bool takesMany = false;

    bool isPositional() const { return names.front().front() != '-'; }
};

struct CommandInfo {
    std::string name;
    std::string description;
    std::vector<OptionInfo> options = {};
    std::vector<CommandInfo> commands = {};
};

} // namespace Base
