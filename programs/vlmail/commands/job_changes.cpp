// vlmail hold, release and cancel: has the service keep mailings back, let them go, or call them off.
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/service/service_client.h"
#include "vlservice/json/json_text.h"

#include <memory>
#include <ostream>

namespace VlMail {
namespace {

using Protocol::JobAction;

struct Options {
    ServiceOptions service;
    JobAction action = JobAction::Hold;
    std::vector<std::string> mailings;
    bool json = false;
};

int changeJobs(Options const& options, Terminal const& terminal) {
    auto const service = connectToService(options.service, terminal.err);
    json::Object const told = ask(*service, Protocol::JobsChange(options.action, options.mailings));
    Protocol::JobsChangeAnswer const answer(told);
    if (options.json)
        terminal.out << told << '\n';
    else
        for (Protocol::JobReport const& job : answer.jobs)
            terminal.out << job.id << ", " << Protocol::stateName(job.state) << '\n';
    for (Protocol::JobRefusal const& refused : answer.refused)
        terminal.complain(Base::errorSaid(refused.why, Base::Code::StateRefused));
    if (answer.refused.empty())
        return FINE;
    return answer.jobs.empty() ? FAILED : INCOMPLETE;
}

void addChange(Base::Command const& app, Task& task, JobAction action, char const* description) {
    auto const options = std::make_shared<Options>();
    options->action = action;
    Base::Command const command = app.addCommand(Protocol::actionName(action), description);
    command.addOption("MAILING", options->mailings, "Ids of mailings, as vlmail status tells them")
        .required();
    command.addFlag("--json", options->json, "The service's answer as one JSON object");
    addServiceOptions(command, options->service);
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return changeJobs(*options, terminal); }; });
}

} // namespace

void addJobChangeCommands(Base::Command const& app, Task& task) {
    addChange(app, task, JobAction::Hold, "Has the service keep mailings until they are released");
    addChange(app, task, JobAction::Release,
              "Lets mailings go on that the service holds, also in front of their time");
    addChange(app, task, JobAction::Cancel, "Calls mailings back that the service has not handed over yet");
}

} // namespace VlMail
