// vlmail discover: which service answers on the network, and what may be wrong when none does.
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/service/multicast_probe.h"
#include "programs/vlmail/service/service_client.h"
#include "programs/vlmail/terminal/text_table.h"
#include "vlservice/ipc/discovery_cli.h"
#include "vlservice/json/json_text.h"

#include <memory>
#include <ostream>

namespace VlMail {
namespace {

struct Options {
    ServiceOptions service;
    bool doctor = false;
    bool json = false;
};

/// What became of a connection to it: an answer on the network proves nothing.
std::string connectionTo(ServiceAddress const& address, Options const& options, Terminal const& terminal) {
    try {
        connectToService(address, options.service, terminal.err);
        return "ok";
    } catch (std::exception const& failure) {
        return failure.what();
    }
}

int discover(Options const& options, Terminal const& terminal) {
    ServiceAddress const address = findService(options.service);
    std::string const connection = connectionTo(address, options, terminal);
    if (options.json) {
        terminal.out << json::Object{{"host", address.host},
                                     {"port", address.port},
                                     {"connection", connection}}
                     << '\n';
    } else {
        TextTable table({{"service"}, {"connection"}});
        table.addRow({address.text(), connection});
        table.print(terminal.out);
    }
    return connection == "ok" ? FINE : INCOMPLETE;
}

std::string joined(std::vector<std::string> const& texts) {
    std::string all;
    for (std::string const& text : texts)
        all += (all.empty() ? "" : ", ") + text;
    return all;
}

std::string backIn(ProbeReport const& report) {
    if (!report.failure.empty())
        return "";
    std::string text = report.heardItself ? "own request" : "nothing, not even the own request";
    if (!report.answers.empty())
        text = joined(report.answers);
    return report.foreign == 0 ? text
                               : text + ", and " + std::to_string(report.foreign) + " foreign datagrams";
}

void print(std::ostream& out, std::vector<ProbeReport> const& reports) {
    TextTable table({{"interface"}, {"address"}, {"sent"}, {"came back"}});
    for (ProbeReport const& report : reports)
        table.addRow({report.interface, report.address,
                      report.failure.empty() ? "yes" : "no: " + report.failure, backIn(report)});
    table.print(out);
    for (std::string const& hint : hintsFor(reports))
        out << "hint: " << hint << '\n';
}

int examine(Options const& options, Terminal const& terminal) {
    std::vector<ProbeReport> const reports =
        probeNetwork(std::chrono::milliseconds(Ipc::DiscoveryCli::DISCOVERY_TIMEOUT.total_milliseconds()));
    if (options.json)
        terminal.out << toJson(reports) << '\n';
    else
        print(terminal.out, reports);
    return hintsFor(reports).empty() ? FINE : FAILED;
}

} // namespace

void addDiscoverCommand(Base::Command const& app, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const command = app.addCommand("discover", "Looks for the service on the network");
    command.addFlag("--doctor", options->doctor,
                    "Show what goes out and comes back on each network interface");
    command.addFlag("--json", options->json, "The result as one JSON object");
    addServiceOptions(command, options->service);
    command.whenNamed([=, &task] {
        task = [=](Terminal const& terminal) {
            return options->doctor ? examine(*options, terminal) : discover(*options, terminal);
        };
    });
}

} // namespace VlMail
