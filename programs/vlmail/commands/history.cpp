// vlmail history: what people have changed in the service.
#include "programs/protocol/history.h"
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

struct Options {
    ServiceOptions service;
    std::string node;
    std::size_t limit = 100;
    bool json = false;
};

void print(std::ostream& out, Protocol::HistoryAnswer const& answer) {
    TextTable table({{"when"}, {"who"}, {"node"}, {"what"}, {"was"}, {"is"}});
    for (Protocol::HistoryEntry const& entry : answer.entries)
        table.addRow(
            {LocalTime::toText(entry.at), entry.who, nodeInWords(entry.id), entry.what, entry.was, entry.is});
    if (table.empty())
        out << "nobody has changed anything there\n";
    else
        table.print(out);
}

int show(Options const& options, Terminal const& terminal) {
    Protocol::HistoryQuery query;
    query.limit = static_cast<long long>(options.limit);
    if (!options.node.empty())
        query.id = nodeIdIn(options.node);
    auto const service = connectToService(options.service, terminal.err);
    json::Object const answer = ask(*service, query);
    if (options.json)
        terminal.out << answer << '\n';
    else
        print(terminal.out, Protocol::HistoryAnswer(answer));
    return FINE;
}

} // namespace

void addHistoryCommand(Base::Command const& app, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const history =
        app.addCommand("history", "Shows who has changed settings, tokens and mailings, and what");
    history.addOption("--node", options->node,
                      "Of this node and all below it; / is the root [all that one's own token covers]");
    history.addCount("--limit", options->limit, "So many at most, the youngest, up to 1000");
    history.addFlag("--json", options->json, "The service's answer as one JSON object");
    addServiceOptions(history, options->service);
    history.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return show(*options, terminal); }; });
}

} // namespace VlMail
