// vlmail status: how far the service has brought the mailings.
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/service/service_client.h"
#include "programs/vlmail/terminal/text_table.h"
#include "vlservice/ipc/update_status.h"
#include "vlservice/json/json_text.h"
#include "vlservice/platform/local_time.h"

#include <filesystem>
#include <memory>
#include <ostream>

namespace VlMail {
namespace {

struct Options {
    ServiceOptions service;
    std::vector<std::string> packs;
    std::string database;
    bool update = false;
    bool json = false;
};

/// What keeps a job from going on, and what should not take so long.
std::string noteOn(json::Object const& job) {
    std::string const problem = job.get("problem").textOrEmpty();
    std::string const alarm = job.get("alarm").textOrEmpty();
    return problem.empty() || alarm.empty() ? problem + alarm : problem + "; " + alarm;
}

void print(std::ostream& out, json::Array const& jobs) {
    constexpr auto RIGHT = TextTable::Align::Right;
    TextTable table(
        {{"mailing"}, {"state"}, {"since"}, {"documents", RIGHT}, {"pages", RIGHT}, {"title"}, {"note"}});
    for (json::Value const& element : jobs) {
        json::Object const& job = element.toObject();
        table.addRow({job.get("id").textOrEmpty(), job.get("state").textOrEmpty(),
                      LocalTime::toText(job.get("changed").intOrZero()),
                      std::to_string(job.get("documents").intOrZero()),
                      std::to_string(job.get("pages").intOrZero()), job.get("title").textOrEmpty(),
                      noteOn(job)});
    }
    if (table.empty())
        out << "the service has no such mailings\n";
    else
        table.print(out);
}

bool anyFailed(json::Array const& jobs) {
    for (json::Value const& job : jobs)
        if (job.toObject().get("state").textOrEmpty() == "failed")
            return true;
    return false;
}

int showStatus(Options const& options, Terminal const& terminal) {
    auto const service = connectToService(options.service, terminal);
    std::filesystem::path const database =
        options.database.empty() ? std::filesystem::path() : std::filesystem::absolute(options.database);
    std::string const folder = database.parent_path().string();
    std::string const name = database.filename().string();
    if (options.update)
        service->call<Ipc::UpdateStatus>(folder, name);
    json::Object query{{"query", "jobs"}, {"db_host", folder}, {"db_name", name}};
    if (!options.packs.empty()) {
        json::Array ids;
        for (std::string const& pack : options.packs)
            ids.append(pack);
        query.set("ids", ids);
    }
    json::Object const answer = ask(*service, query);
    json::Array const jobs = answer.get("jobs").toArray();
    if (options.json)
        terminal.out << answer << '\n';
    else
        print(terminal.out, jobs);
    return anyFailed(jobs) ? INCOMPLETE : FINE;
}

} // namespace

void addStatusCommand(Base::Command const& app, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const status =
        app.addCommand("status", "Shows how far the service has brought the mailings");
    status.addOption("MAILING", options->packs, "Ids of mailings [all]");
    status.addOption("--database", options->database, "Only mailings from this pack database")
        .valueName("FILE");
    status.addFlag("--update", options->update, "Have the service look first at what the carrier has done");
    status.addFlag("--json", options->json, "The service's answer as one JSON object");
    addServiceOptions(status, options->service);
    status.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return showStatus(*options, terminal); }; });
}

} // namespace VlMail
