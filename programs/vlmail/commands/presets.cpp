#include "programs/vlmail/commands/presets.h"

#include <CLI/CLI.hpp>

namespace VlMail {

void addPresetsCommand(CLI::App& app, Task& task) {
    CLI::App* const presets =
        app.add_subcommand("presets", "Tells how presets answer, and what is wrong with them");
    presets->require_subcommand(1);
    addPresetsMatchCommand(*presets, task);
    addPresetsLintCommand(*presets, task);
    addPresetsTestCommand(*presets, task);
}

} // namespace VlMail
