#pragma once
// What a shell completes on a program's command line, as a script for each shell.

#include "programs/base/command_tree.h"

#include <string>

namespace Manual {

std::string bashCompletion(Base::CommandInfo const& program);
std::string zshCompletion(Base::CommandInfo const& program);
std::string fishCompletion(Base::CommandInfo const& program);

} // namespace Manual
