#pragma once
// What the subcommands of vlmail share: how they are registered.

#include "programs/vlmail/terminal/terminal.h"

#include <functional>

namespace CLI {
class App;
}

namespace VlMail {

/// What a parsed command line asks for; gives the exit status.
using Task = std::function<int(Terminal const&)>;

// Each adds its subcommand to `app` and, when the command line names it, leaves its task in `task`.
// One source file a subcommand.
void addDiscoverCommand(CLI::App& app, Task& task);
void addLetterCommand(CLI::App& app, Task& task);
void addMailCommand(CLI::App& app, Task& task);
void addPackCommand(CLI::App& app, Task& task);
void addPlanCommand(CLI::App& app, Task& task);
void addPresetsCommand(CLI::App& app, Task& task);
void addPriceCommand(CLI::App& app, Task& task);
void addSettingsCommand(CLI::App& app, Task& task);
void addStatusCommand(CLI::App& app, Task& task);
void addUploadCommand(CLI::App& app, Task& task);

/// Parses the command line, carries it out and gives the exit status. Throws nothing derived from
/// std::exception.
int run(int argc, char const* const* argv, Terminal const& terminal);

} // namespace VlMail
