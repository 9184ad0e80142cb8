// vlmail pack: what is in a container, and whether it is whole.
#include "programs/vlmail/command.h"

#include <CLI/CLI.hpp>

namespace VlMail {

void addPackCommand(CLI::App& app, Task&) {
    CLI::App* const pack = app.add_subcommand("pack", "Looks into mailing files");
    pack->require_subcommand(1);
}

} // namespace VlMail
