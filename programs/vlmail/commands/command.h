#pragma once
// What the subcommands of vlmail share: how they are registered.

#include "programs/base/command_line.h"
#include "programs/vlmail/terminal/terminal.h"

#include <functional>
#include <string>
#include <string_view>

namespace VlMail {

/// What a parsed command line asks for; gives the exit status.
using Task = std::function<int(Terminal const&)>;

// Each adds its subcommand to `app` and, when the command line names it, leaves its task in `task`.
// One source file a subcommand.
void addBounceCommand(Base::Command const& app, Task& task);
void addCarriersCommand(Base::Command const& app, Task& task);
void addCheckCommand(Base::Command const& app, Task& task);
void addDiscoverCommand(Base::Command const& app, Task& task);
void addDoctorCommand(Base::Command const& app, Task& task);
void addDocumentsCommand(Base::Command const& app, Task& task);
/// Goes behind all others: it tells of them.
void addHelpCommand(Base::Command const& app, Task& task);
/// hold, release and cancel.
void addJobChangeCommands(Base::Command const& app, Task& task);
void addHistoryCommand(Base::Command const& app, Task& task);
void addLetterCommand(Base::Command const& app, Task& task);
/// settle and resend.
void addLetterChangeCommands(Base::Command const& app, Task& task);
void addMailCommand(Base::Command const& app, Task& task);
void addPackCommand(Base::Command const& app, Task& task);
void addPlanCommand(Base::Command const& app, Task& task);
void addPresetsCommand(Base::Command const& app, Task& task);
void addPriceCommand(Base::Command const& app, Task& task);
void addSchemaCommand(Base::Command const& app, Task& task);
void addSendCommand(Base::Command const& app, Task& task);
void addSettingsCommand(Base::Command const& app, Task& task);
/// resume and discard.
void addStrandedCommands(Base::Command const& app, Task& task);
void addStatusCommand(Base::Command const& app, Task& task);
void addTokenCommand(Base::Command const& app, Task& task);
void addUploadCommand(Base::Command const& app, Task& task);
void addWorkbenchCommand(Base::Command const& app, Task& task);

/// The line of a run that ends because memory does; it is written as it stands, without taking any.
extern char const OUT_OF_MEMORY[];

/// Parses the command line, carries it out and gives the exit status. Throws nothing derived from
/// std::exception. `commit` is what --version tells.
int run(int argc, char const* const* argv, Terminal const& terminal, std::string const& commit = {});

/// What the command line knows when `firstWord` is its first: that command and those beside it, or all, as
/// the manual tells them.
Base::CommandInfo commandInfo(std::string_view firstWord = {});

} // namespace VlMail
