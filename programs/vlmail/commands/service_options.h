#pragma once
// The options of every subcommand that talks to the service.

#include "programs/base/command_line.h"
#include "programs/vlmail/service/service_client.h"
#include "programs/vlmail/service/service_line.h"
#include "programs/vlmail/terminal/terminal.h"

#include <filesystem>
#include <string>

namespace VlMail {

/// `options` has to outlive the parsing of the command line.
void addServiceOptions(Base::Command const& command, ServiceOptions& options);

/// Leads to the service that is found at once; when that is lost, to the next that knows the token, which is
/// told. The options and the terminal have to outlive it.
ServiceLine::Connect routeToService(ServiceOptions const& options, Terminal const& terminal);
/// A connection that is made again when it breaks. The options and the terminal have to outlive it.
ServiceLine lineToService(ServiceOptions const& options, Terminal const& terminal);

/// Which pack database a subcommand is about.
struct PackDatabaseOptions {
    /// Empty for the one of the node.
    std::string file;
    std::string node = "/";
};

/// `options` has to outlive the parsing of the command line.
void addPackDatabaseOptions(Base::Command const& command, PackDatabaseOptions& options);
/// The file that the options mean, by the settings that the service keeps.
std::filesystem::path databaseFor(PackDatabaseOptions const& options, Channel::Client& service);

} // namespace VlMail
