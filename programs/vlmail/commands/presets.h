#pragma once
// The commands under "vlmail presets"; each adds itself and, when it is named, leaves its task.

#include "programs/vlmail/commands/command.h"

namespace VlMail {

void addPresetsMatchCommand(CLI::App& presets, Task& task);
void addPresetsLintCommand(CLI::App& presets, Task& task);
void addPresetsTestCommand(CLI::App& presets, Task& task);

} // namespace VlMail
