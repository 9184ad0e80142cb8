#pragma once
// The options of every subcommand that talks to the service.

#include "programs/base/command_line.h"
#include "programs/vlmail/service/service_client.h"

namespace VlMail {

/// `options` has to outlive the parsing of the command line.
void addServiceOptions(Base::Command const& command, ServiceOptions& options);

} // namespace VlMail
