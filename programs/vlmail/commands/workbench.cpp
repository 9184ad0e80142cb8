// vlmail workbench: presets are changed in a browser, and the letters with them.
#include "programs/vlmail/workbench/workbench.h"
#include "programs/vlmail/commands/batch_command.h"
#include "programs/vlmail/commands/batch_sources.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/settings.h"

#include <memory>
#include <ostream>
#include <spawn.h>
#include <string>
#include <sys/wait.h>
#include <unistd.h>
#include <utility>

namespace VlMail {
namespace {

struct Options {
    Workbench::Setup setup;
    std::string settings;
    /// Empty when none was named.
    std::string node;
    ServiceOptions service;
    bool opens = false;
    WorkerOptions reading;
};

/// The desktop's own way to a browser; whoever has none opens the address himself.
void open(std::string const& url, Terminal const& terminal) {
    char program[] = "xdg-open";
    std::string address = url;
    char* const arguments[] = {program, address.data(), nullptr};
    pid_t process = 0;
    int status = 0;
    bool const isDone = ::posix_spawnp(&process, program, nullptr, nullptr, arguments, environ) == 0 &&
                        ::waitpid(process, &status, 0) == process && WIFEXITED(status) &&
                        WEXITSTATUS(status) == 0;
    if (!isDone)
        terminal.note("no browser could be opened; open the address above in one");
}

/// Where the settings are, which may bring letterheads and attachments along.
std::unique_ptr<Workbench::SettingsStore> storeFor(Options const& options, Workbench::Setup& setup,
                                                   Terminal const& terminal) {
    if (options.node.empty())
        return options.settings.empty() ? Workbench::settingsNowhere()
                                        : Workbench::settingsInFile(options.settings);
    std::string const node = nodeIdIn(options.node);
    ServiceLine::Connect const connect = routeToService(options.service, terminal);
    setup.elsewhere = documentsAnew(connect, node);
    return Workbench::settingsOfNode(node, nodeInWords(node), connect);
}

int work(Options const& options, Terminal const& terminal) {
    Workbench::Setup setup = options.setup;
    setup.limits = options.reading.workers().limits;
    auto store = storeFor(options, setup, terminal);
    Workbench::serve(setup, std::move(store), [&](std::string const& url) {
        terminal.out << url << std::endl;
        if (options.opens)
            open(url, terminal);
    });
    return FINE;
}

} // namespace

void addWorkbenchCommand(Base::Command const& app, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const command = app.addCommand(
        "workbench", "Shows presets and documents in a browser: a preset is changed and the letter with it");
    command.addOption("FOLDER", options->setup.folder, "The folder with the documents").required();
    Base::Option const settings =
        command.addOption("--settings", options->settings, "A JSON document with settings parts of a node");
    command.addOption("--documents", options->setup.letterheads, DOCUMENTS_HELP);
    command
        .addOption("--node", options->node,
                   "The node of the service whose settings are changed, and whose documents count where "
                   "--documents has none")
        .excludes(settings);
    addServiceOptions(command, options->service);
    command.addFlag("--open", options->opens, "Open the address in a browser, too");
    addLimitOptions(command, options->reading);
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return work(*options, terminal); }; });
}

} // namespace VlMail
