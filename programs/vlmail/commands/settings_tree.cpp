// vlmail settings tree: the nodes that the service knows.
#include "programs/vlmail/commands/settings.h"

#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/terminal/text_table.h"
#include "vlservice/ipc/cfg_ids_for_user.h"
#include "vlservice/ipc/cfg_ids_tree.h"
#include "vlservice/json/json_text.h"

#include <memory>
#include <ostream>

namespace VlMail {
namespace {

struct Options {
    ServiceOptions service;
    std::string user;
    bool json = false;
};

std::string partsIn(Protocol::TreeNode const& node) {
    std::string names;
    for (std::string const& part : node.parts)
        names += (names.empty() ? "" : ", ") + part;
    return names;
}

void addBranch(TextTable& table, Protocol::TreeNode const& node, std::size_t depth) {
    table.addRow({std::string(2 * depth, ' ') + (node.id.empty() ? "/" : node.id), node.description,
                  node.disabled ? "disabled" : "", partsIn(node)});
    for (Protocol::TreeNode const& child : node.children)
        addBranch(table, child, depth + 1);
}

int showTree(Options const& options, Terminal const& terminal) {
    auto const service = connectToService(options.service, terminal.err);
    json::Object const tree = requireAnswer(service->call<Ipc::CfgIdsTree>()->resp());
    if (options.json) {
        terminal.out << tree << '\n';
        return FINE;
    }
    TextTable table({{"node"}, {"description"}, {"state"}, {"own settings"}});
    addBranch(table, Protocol::TreeNode(tree), 0);
    table.print(terminal.out);
    return FINE;
}

int showIds(Options const& options, Terminal const& terminal) {
    auto const service = connectToService(options.service, terminal.err);
    auto const answer = service->call<Ipc::CfgIdsForUser>(options.user);
    if (options.json) {
        terminal.out << static_cast<Ipc::JsonCmdBase const&>(*answer).serializeResp() << '\n';
        return FINE;
    }
    TextTable table({{"node"}, {"description"}, {"state"}});
    for (auto const& [id, description, disabled] : answer->resp())
        table.addRow({id, description, disabled ? "disabled" : ""});
    table.print(terminal.out);
    return FINE;
}

} // namespace

void addSettingsTreeCommand(Base::Command const& settings, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const tree = settings.addCommand("tree", "Shows all nodes");
    Base::Command const ids = settings.addCommand("ids", "Lists the nodes that a user may send for");
    ids.addOption("USER", options->user, "The user's name [the nodes that are no user's]");
    for (Base::Command const command : {tree, ids}) {
        command.addFlag("--json", options->json, "The service's answer as one JSON object");
        addServiceOptions(command, options->service);
    }
    tree.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return showTree(*options, terminal); }; });
    ids.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return showIds(*options, terminal); }; });
}

} // namespace VlMail
