#pragma once
// The subcommands of vlmail pack. One source file each.

#include "programs/vlmail/commands/command.h"

namespace VlMail {

void addPackListCommand(CLI::App& pack, Task& task);
void addPackVerifyCommand(CLI::App& pack, Task& task);
void addPackExtractCommand(CLI::App& pack, Task& task);
void addPackSalvageCommand(CLI::App& pack, Task& task);

} // namespace VlMail
