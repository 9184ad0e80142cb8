// vlmail upload: has the service hand on what it has finished.
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/service/service_client.h"
#include "vlservice/ipc/upload_queued.h"

#include <filesystem>
#include <memory>
#include <ostream>

namespace VlMail {
namespace {

struct Options {
    ServiceOptions service;
    std::string database;
};

int upload(Options const& options, Terminal const& terminal) {
    auto const service = connectToService(options.service, terminal.err);
    std::filesystem::path const database =
        options.database.empty() ? std::filesystem::path() : std::filesystem::absolute(options.database);
    service->call<Ipc::UploadQueued>(database.parent_path().string(), database.filename().string());
    return FINE;
}

} // namespace

void addUploadCommand(Base::Command const& app, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const command =
        app.addCommand("upload", "Has the service hand finished mailings on to its upload folder");
    command.addOption("--database", options->database, "Only mailings from this pack database")
        .valueName("FILE");
    addServiceOptions(command, options->service);
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return upload(*options, terminal); }; });
}

} // namespace VlMail
