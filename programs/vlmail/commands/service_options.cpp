#include "programs/vlmail/commands/service_options.h"

#include <CLI/CLI.hpp>

namespace VlMail {

void addServiceOptions(CLI::App& command, ServiceOptions& options) {
    command.add_option("--service", options.service, "The service to use, instead of looking for one")
        ->type_name("HOST:PORT");
    command.add_option("--token", options.tokenFile, "File with the service's access token")
        ->type_name("FILE");
    command.add_option("--pins", options.pinFile, "File with the certificates that were accepted")
        ->type_name("FILE");
    command
        .add_option("--accept-certificate", options.certificate,
                    "Accept a new certificate of this fingerprint without a question")
        ->type_name("FINGERPRINT");
}

} // namespace VlMail
