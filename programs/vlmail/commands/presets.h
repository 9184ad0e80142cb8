#pragma once
// The commands under "vlmail presets"; each adds itself and, when it is named, leaves its task.

#include "programs/vlmail/commands/command.h"

namespace VlMail {

void addPresetsDraftCommand(Base::Command const& presets, Task& task);
void addPresetsMatchCommand(Base::Command const& presets, Task& task);
void addPresetsLintCommand(Base::Command const& presets, Task& task);
void addPresetsTestCommand(Base::Command const& presets, Task& task);

} // namespace VlMail
