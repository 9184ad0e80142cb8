#pragma once
// The subcommands of vlmail pack. One source file each.

#include "programs/vlmail/commands/command.h"

namespace VlMail {

void addPackListCommand(Base::Command const& pack, Task& task);
void addPackVerifyCommand(Base::Command const& pack, Task& task);
void addPackExtractCommand(Base::Command const& pack, Task& task);
void addPackSalvageCommand(Base::Command const& pack, Task& task);

} // namespace VlMail
