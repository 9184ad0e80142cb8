// vlmail workbench: presets are changed in a browser, and the letters beside them.
#include "programs/vlmail/workbench/workbench.h"
#include "programs/vlmail/commands/command.h"

#include <memory>
#include <ostream>

namespace VlMail {
namespace {

struct Options {
    Workbench::Setup setup;
};

int work(Options const& options, Terminal const& terminal) {
    Workbench::serve(options.setup, [&](std::string const& url) { terminal.out << url << std::endl; });
    return FINE;
}

} // namespace

void addWorkbenchCommand(Base::Command const& app, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const command = app.addCommand(
        "workbench", "Opens presets and documents in a browser: a preset is changed and the letter with it");
    command.addOption("FOLDER", options->setup.folder, "The folder with the documents").required();
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return work(*options, terminal); }; });
}

} // namespace VlMail
