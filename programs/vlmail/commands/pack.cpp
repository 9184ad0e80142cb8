// vlmail pack: what is in a mailing file, whether it is whole, and what can be saved of it.
#include "programs/vlmail/commands/pack.h"

#include <CLI/CLI.hpp>

namespace VlMail {

void addPackCommand(CLI::App& app, Task& task) {
    CLI::App* const pack = app.add_subcommand("pack", "Looks into mailing files");
    pack->require_subcommand(1);
    addPackListCommand(*pack, task);
    addPackVerifyCommand(*pack, task);
    addPackExtractCommand(*pack, task);
    addPackSalvageCommand(*pack, task);
}

} // namespace VlMail
