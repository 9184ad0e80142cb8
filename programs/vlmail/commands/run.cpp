#include "programs/vlmail/commands/command.h"

#include <ostream>

namespace VlMail {
namespace {

void addCommands(Base::Command const& command, Task& task) {
    command.requireCommand();
    addDiscoverCommand(command, task);
    addLetterCommand(command, task);
    addMailCommand(command, task);
    addPackCommand(command, task);
    addPlanCommand(command, task);
    addPresetsCommand(command, task);
    addPriceCommand(command, task);
    addSettingsCommand(command, task);
    addStatusCommand(command, task);
    addStrandedCommands(command, task);
    addUploadCommand(command, task);
}

} // namespace

int run(int argc, char const* const* argv, Terminal const& terminal) {
    Base::CommandLine line(
        "Sends letters out of documents: reads them, says what was found, and packs mailings.", "vlmail");
    Task task;
    addCommands(line.command(), task);
    try {
        return line.read(argc, argv, terminal.out) ? task(terminal) : FINE;
    } catch (Base::UsageError const& wrong) {
        terminal.complain(std::string(wrong.what()) + "; --help explains");
    } catch (std::exception const& failure) {
        terminal.complain(failure.what());
    }
    return FAILED;
}

} // namespace VlMail
