#pragma once
// The options of every subcommand that talks to the service.

#include "programs/vlmail/service/service_client.h"

namespace CLI {
class App;
}

namespace VlMail {

/// `options` has to outlive the parsing of the command line.
void addServiceOptions(CLI::App& command, ServiceOptions& options);

} // namespace VlMail
