#include "programs/vlmail/commands/command.h"

#include <CLI/CLI.hpp>

#include <ostream>

namespace VlMail {

int run(int argc, char const* const* argv, Terminal const& terminal) {
    CLI::App app("Sends letters out of documents: reads them, says what was found, and packs mailings.",
                 "vlmail");
    app.require_subcommand(1);
    Task task;
    addDiscoverCommand(app, task);
    addLetterCommand(app, task);
    addMailCommand(app, task);
    addPackCommand(app, task);
    addPlanCommand(app, task);
    addPresetsCommand(app, task);
    addPriceCommand(app, task);
    addSettingsCommand(app, task);
    addStatusCommand(app, task);
    addUploadCommand(app, task);
    try {
        app.parse(argc, argv);
        return task(terminal);
    } catch (CLI::ParseError const& wrong) {
        // Asking for help is one of them.
        if (wrong.get_exit_code() == 0)
            return app.exit(wrong, terminal.out, terminal.err);
        terminal.complain(std::string(wrong.what()) + "; --help explains");
        return FAILED;
    } catch (std::exception const& failure) {
        terminal.complain(failure.what());
        return FAILED;
    }
}

} // namespace VlMail
