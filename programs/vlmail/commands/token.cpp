// vlmail token: who may use the service, and what he may do there.
#include "programs/protocol/token.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/commands/settings.h"
#include "programs/vlmail/service/service_client.h"
#include "programs/vlmail/terminal/text_table.h"
#include "vlservice/json/json_text.h"
#include "vlservice/platform/local_time.h"

#include <memory>
#include <ostream>

namespace VlMail {
namespace {

using Protocol::roleName;
using Protocol::TokenReport;

struct Options {
    ServiceOptions service;
    std::string name;
    std::string role;
    std::string node;
    bool json = false;
};

int add(Options const& options, Terminal const& terminal) {
    Protocol::TokenAddition const addition(options.name, Protocol::roleNamed(options.role),
                                           nodeIdIn(options.node));
    auto const service = connectToService(options.service, terminal.err);
    json::Object const answer = ask(*service, addition);
    if (options.json)
        terminal.out << answer << '\n';
    else
        terminal.out
            << "The token " << addition.name << " has the role " << roleName(addition.role) << " at "
            << nodeInWords(addition.id) << ". It is shown this once:\n\n  "
            << Protocol::TokenAdditionAnswer(answer).token
            << "\n\nWho is to have it keeps it in a file of mode 0600: ~/.config/vlmail/token, or one "
               "named with --token.\n";
    return FINE;
}

void print(std::ostream& out, Protocol::TokensAnswer const& answer) {
    TextTable table({{"token"}, {"role"}, {"node"}, {"since"}, {"given out by"}});
    for (TokenReport const& token : answer.tokens)
        table.addRow({token.name, roleName(token.role), nodeInWords(token.id),
                      token.added > 0 ? LocalTime::toText(token.added) : "the service's own file",
                      token.addedBy});
    if (table.empty())
        out << "there are no tokens that this one covers\n";
    else
        table.print(out);
}

int list(Options const& options, Terminal const& terminal) {
    auto const service = connectToService(options.service, terminal.err);
    json::Object const answer = ask(*service, Protocol::TokensQuery());
    if (options.json)
        terminal.out << answer << '\n';
    else
        print(terminal.out, Protocol::TokensAnswer(answer));
    return FINE;
}

int revoke(Options const& options, Terminal const& terminal) {
    auto const service = connectToService(options.service, terminal.err);
    TokenReport const revoked(ask(*service, Protocol::TokenRevocation(options.name)));
    terminal.out << "The token " << revoked.name << ", which had the role " << roleName(revoked.role)
                 << " at " << nodeInWords(revoked.id) << ", is revoked.\n";
    return FINE;
}

Base::Command addAction(Base::Command const& token, Task& task, char const* name, char const* description,
                        int (*run)(Options const&, Terminal const&),
                        std::shared_ptr<Options> const& options) {
    Base::Command const command = token.addCommand(name, description);
    addServiceOptions(command, options->service);
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return run(*options, terminal); }; });
    return command;
}

} // namespace

void addTokenCommand(Base::Command const& app, Task& task) {
    Base::Command const token =
        app.addCommand("token", "Gives out access tokens of the service, shows them and takes them back");
    token.requireCommand();
    auto const options = std::make_shared<Options>();
    Base::Command const adding =
        addAction(token, task, "add", "Makes a token for somebody, and shows it this once", &add, options);
    adding.addOption("NAME", options->name, "What it is called: one word").required();
    adding
        .addOption(
            "--role", options->role,
            "read: see settings and jobs; send: also send mailings and decide about them; settings: also "
            "change settings and documents; admin: also give out tokens")
        .required();
    adding.addOption("--node", options->node, "The node that it covers, with all below it; / is the root")
        .required();
    adding.addFlag("--json", options->json, "The service's answer as one JSON object");
    addAction(token, task, "list", "Shows the tokens of the nodes that one's own token covers", &list,
              options)
        .addFlag("--json", options->json, "The service's answer as one JSON object");
    addAction(token, task, "revoke", "Takes a token back, also of who is connected", &revoke, options)
        .addOption("NAME", options->name, "The name of the token")
        .required();
}

} // namespace VlMail
