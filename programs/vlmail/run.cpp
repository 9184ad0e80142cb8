#include "programs/vlmail/command.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <ostream>

namespace VlMail {

void Terminal::complain(std::string const& text) const {
    std::string line = text;
    // Names from outside may hold line breaks; an error stays one line.
    std::replace_if(
        line.begin(), line.end(), [](char c) { return c == '\n' || c == '\r'; }, ' ');
    err << "vlmail: " << line << std::endl;
}

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
