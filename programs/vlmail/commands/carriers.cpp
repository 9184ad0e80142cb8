// vlmail carriers: how the ways out for letters are doing, and what a person wants of them.
#include "programs/protocol/carrier.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/service/service_client.h"
#include "programs/vlmail/terminal/text_table.h"
#include "vlservice/json/json_text.h"
#include "vlservice/platform/local_time.h"

#include <memory>
#include <ostream>

namespace VlMail {
namespace {

using Protocol::CarrierAction;

struct Options {
    ServiceOptions service;
    CarrierAction action = CarrierAction::Test;
    std::string channel;
    bool json = false;
};

void print(std::ostream& out, Protocol::CarriersAnswer const& answer) {
    constexpr auto RIGHT = TextTable::Align::Right;
    TextTable table(
        {{"channel"}, {"type"}, {"state"}, {"since"}, {"waiting", RIGHT}, {"uncertain", RIGHT}, {"note"}});
    for (Protocol::CarrierReport const& carrier : answer.carriers)
        table.addRow({carrier.channel, carrier.type, carrier.state,
                      carrier.since > 0 ? LocalTime::toText(carrier.since) : std::string(),
                      std::to_string(carrier.waiting), std::to_string(carrier.uncertain), carrier.says});
    if (table.empty())
        out << "the service has no carriers: \"vlmail settings service carriers=FILE\" sets some\n";
    else
        table.print(out);
}

void show(json::Object const& answer, Options const& options, Terminal const& terminal) {
    if (options.json)
        terminal.out << answer << '\n';
    else
        print(terminal.out, Protocol::CarriersAnswer(answer));
}

int list(Options const& options, Terminal const& terminal) {
    auto const service = connectToService(options.service, terminal.err);
    show(ask(*service, Protocol::CarriersQuery()), options, terminal);
    return FINE;
}

int change(Options const& options, Terminal const& terminal) {
    auto const service = connectToService(options.service, terminal.err);
    json::Object const answer = ask(*service, Protocol::CarrierChange(options.action, options.channel));
    if (options.action != CarrierAction::Test || options.json)
        show(answer, options, terminal);
    else
        terminal.out << Protocol::CarrierTestAnswer(answer).says << '\n';
    return FINE;
}

Base::Command addCommand(Base::Command const& carriers, Task& task, char const* name, char const* description,
                         int (*run)(Options const&, Terminal const&),
                         std::shared_ptr<Options> const& options) {
    Base::Command const command = carriers.addCommand(name, description);
    command.addFlag("--json", options->json, "The service's answer as one JSON object");
    addServiceOptions(command, options->service);
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return run(*options, terminal); }; });
    return command;
}

void addChange(Base::Command const& carriers, Task& task, CarrierAction action, char const* description) {
    auto const options = std::make_shared<Options>();
    options->action = action;
    addCommand(carriers, task, Protocol::carrierActionName(action), description, &change, options)
        .addOption("CHANNEL", options->channel, "The channel, such as postal or email")
        .required();
}

} // namespace

void addCarriersCommand(Base::Command const& app, Task& task) {
    Base::Command const carriers =
        app.addCommand("carriers", "The ways out that the service has for letters, by channel");
    carriers.requireCommand();
    addCommand(carriers, task, "list", "Shows the carriers, how they are doing, and what waits for them",
               &list, std::make_shared<Options>());
    addChange(carriers, task, CarrierAction::Test,
              "Tries a carrier without sending anything, and says what the other side offers");
    addChange(carriers, task, CarrierAction::Pause, "Hands nothing over to a carrier until it is resumed");
    addChange(carriers, task, CarrierAction::Resume,
              "Lets a carrier go on that is paused, or that fails and is tried now and then");
}

} // namespace VlMail
