// vlmail resume and discard: packs that a broken connection, or a program that was ended, has left in the
// pack database.
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/commands/settings.h"
#include "programs/vlmail/mailings/pack_delivery.h"
#include "programs/vlmail/service/service_client.h"

#include <memory>
#include <ostream>

namespace VlMail {
namespace {

struct Options {
    ServiceOptions service;
    std::string pack;
    PackDatabaseOptions database;
    bool upload = false;
};

int resume(Options const& options, Terminal const& terminal) {
    ServiceLine line = lineToService(options.service, terminal);
    std::filesystem::path const database = databaseFor(options.database, line.client());
    int status = FINE;
    auto const tellLeftOut = [&](long long number, std::string const& why) {
        terminal.out << "left out: " << options.pack << ", letter " << number << ": " << why << '\n';
        status = INCOMPLETE;
    };
    try {
        Protocol::JobReport const job =
            deliverPack(line, database, options.pack, options.upload, {}, tellLeftOut);
        terminal.out << job.id << ", " << Protocol::stateName(job.state) << '\n';
    } catch (NothingToSend const&) {
        Mailing::removePack(database, options.pack);
    }
    return status;
}

int discard(Options const& options, Terminal const& terminal) {
    auto const service = connectToService(options.service, terminal.err);
    discardPack(*service, databaseFor(options.database, *service), options.pack);
    return FINE;
}

Base::Command addCommand(Base::Command const& app, Task& task, char const* name, char const* description,
                         int (*run)(Options const&, Terminal const&),
                         std::shared_ptr<Options> const& options) {
    Base::Command const command = app.addCommand(name, description);
    command.addOption("MAILING", options->pack, "The id of a mailing").required();
    addPackDatabaseOptions(command, options->database);
    addServiceOptions(command, options->service);
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return run(*options, terminal); }; });
    return command;
}

} // namespace

void addStrandedCommands(Base::Command const& app, Task& task) {
    auto const options = std::make_shared<Options>();
    addCommand(app, task, "resume", "Sends a mailing again that was left in the pack database; never twice",
               &resume, options)
        .addFlag("--upload", options->upload, "Has the service hand it on at once");
    addCommand(app, task, "discard", "Erases a mailing from the pack database that is not to go out",
               &discard, options);
}

} // namespace VlMail
