#include "programs/vlmail/commands/service_options.h"

#include "programs/vlmail/commands/settings.h"
#include "programs/vlmail/service/service_route.h"
#include "programs/vlmail/service/service_search.h"

#include <memory>
#include <ostream>

namespace VlMail {

void addServiceOptions(Base::Command const& command, ServiceOptions& options) {
    command.addOption("--service", options.service, "The service to use, instead of looking for one")
        .valueName("HOST:PORT");
    command.addOption("--token", options.tokenFile, "File with the service's access token").valueName("FILE");
    command.addOption("--pins", options.pinFile, "File with the certificates that were accepted")
        .valueName("FILE");
    command
        .addOption("--accept-certificate", options.certificate,
                   "Accept a new certificate of this fingerprint without a question")
        .valueName("FINGERPRINT");
    command.addFlag("--allow-channel-1", options.allowsChannel1,
                    "Go on with a service that speaks version 1 of the connection alone");
}

ServiceLine::Connect routeToService(ServiceOptions const& options, Terminal const& terminal) {
    auto const tell = [&terminal](ServiceAddress const& lost, ServiceAddress const& next) {
        terminal.err << "note: the service " << lost.text() << " was lost; going on with " << next.text()
                     << '\n';
    };
    auto const route = std::make_shared<ServiceRoute>(
        findService(options),
        [&options, &terminal](ServiceAddress const& address) {
            return connectToService(address, options, terminal.err);
        },
        [&options] { return searchProven(tokenIfAny(options)); }, tell);
    return [route] { return route->connect(); };
}

ServiceLine lineToService(ServiceOptions const& options, Terminal const& terminal) {
    return ServiceLine(routeToService(options, terminal));
}

void addPackDatabaseOptions(Base::Command const& command, PackDatabaseOptions& options) {
    command.addOption("--database", options.file, "The pack database [that of the node]").valueName("FILE");
    command.addOption("--node", options.node, "The node that the mailing was sent for").showDefault();
}

std::filesystem::path databaseFor(PackDatabaseOptions const& options, Channel::Client& service) {
    return options.file.empty() ? packDatabaseOf(service, nodeIdIn(options.node))
                                : std::filesystem::absolute(options.file);
}

} // namespace VlMail
