#include "programs/vlmail/commands/presets.h"

namespace VlMail {

void addPresetsCommand(Base::Command const& app, Task& task) {
    Base::Command const presets =
        app.addCommand("presets", "Tells how presets answer, and what is wrong with them");
    presets.requireCommand();
    addPresetsDraftCommand(presets, task);
    addPresetsMatchCommand(presets, task);
    addPresetsLintCommand(presets, task);
    addPresetsTestCommand(presets, task);
}

} // namespace VlMail
