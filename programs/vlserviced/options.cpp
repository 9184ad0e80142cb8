#include "programs/vlserviced/options.h"

#include <CLI/CLI.hpp>

#include <ostream>

namespace VlServiced {

std::variant<Options, int> parseOptions(int argc, char const* const* argv, std::ostream& out,
                                        std::ostream& err) {
    Options options;
    CLI::App app("Keeps settings for the clients of a network and brings their mailings on the way.",
                 "vlserviced");
    app.add_option("--data", options.data,
                   "Folder with everything that the service keeps; made when it is not there")
        ->required()
        ->type_name("FOLDER");
    app.add_option("--outbox", options.outbox, "Folder for finished mailings [outbox in the data folder]")
        ->type_name("FOLDER");
    app.add_option("--listen", options.listen, "IP address to listen on; all but loopback want a certificate")
        ->capture_default_str()
        ->type_name("ADDRESS");
    app.add_option("--port", options.port, "TCP port; 0 takes a free one and says which")
        ->capture_default_str()
        ->type_name("N");
    app.add_option("--certificate", options.certificate, "Certificate for TLS, with its chain")
        ->type_name("PEM");
    app.add_option("--key", options.key, "Private key of the certificate")->type_name("PEM");
    app.add_option("--announce", options.announce, "Host to answer discovery with [the address listened on]")
        ->type_name("HOST");
    app.add_flag("!--no-discovery", options.answersDiscovery,
                 "Do not answer clients that look for a service");
    app.add_flag("--verbose", options.verbose, "Log every datagram of discovery");
    try {
        app.parse(argc, argv);
    } catch (CLI::ParseError const& wrong) {
        return app.exit(wrong, out, err) == 0 ? 0 : 1;
    }
    return options;
}

} // namespace VlServiced
