// vlmail settings set, reset and remove: what a node holds itself.
#include "programs/vlmail/commands/settings.h"

#include "programs/base/error.h"
#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/terminal/text_table.h"
#include "vlservice/ipc/remove_cfg_node.h"
#include "vlservice/ipc/set_part_tmpl.h"
#include "vlservice/ipc/update_cfg.h"
#include "vlservice/json/json_text.h"

#include <filesystem>
#include <memory>
#include <ostream>
#include <utility>

namespace VlMail {
namespace {

struct Options {
    ServiceOptions service;
    std::string node;
    std::string part;
    /// For set a file or assignments, for reset keys.
    std::vector<std::string> what;
    bool json = false;
};

template<typename Cmd, typename Part>
void send(Channel::Client& service, Cfg::Id const& node, json::Value const& part) {
    requireNoError(service.call<Cmd>(node, Part(part, false, false))->respErrMsg());
}

struct SetCommand {
    std::string part;
    void (*send)(Channel::Client&, Cfg::Id const&, json::Value const&);
};

std::vector<SetCommand> const& setCommands() {
    static std::vector<SetCommand> const all{
        {Cfg::App::PART_NAME, &send<Ipc::SetApp, Cfg::App>},
        {Cfg::Inet::PART_NAME, &send<Ipc::SetInet, Cfg::Inet>},
        {Cfg::PO::PART_NAME, &send<Ipc::SetPO, Cfg::PO>},
        {Cfg::Departments::PART_NAME, &send<Ipc::SetDepartments, Cfg::Departments>},
        {Cfg::Profiles::PART_NAME, &send<Ipc::SetProfiles, Cfg::Profiles>},
        {Cfg::Presets::PART_NAME, &send<Ipc::SetPresets, Cfg::Presets>},
    };
    return all;
}

/// Replaces all own values of a part.
void setPart(Channel::Client& service, std::string const& node, std::string const& part,
             json::Value const& own) {
    for (SetCommand const& command : setCommands())
        if (command.part == part)
            return command.send(service, Cfg::Id(node, false), own);
    throw Base::Error(Base::Code::SettingUnknown,
                      "there is no part \"" + part + "\"; name app, inet, po, deps, profiles or presets");
}

using Protocol::PartSettings;

PartSettings fetchPart(Channel::Client& service, std::string const& node, std::string const& part) {
    return fetchSettings(service, node, {part}).part(part);
}

void requireKey(std::string const& part, std::string const& key, json::Object const& values) {
    if (values.get(key))
        return;
    std::string known;
    for (auto const& [name, value] : values)
        known += (known.empty() ? "" : ", ") + std::string(name);
    throw Base::Error(Base::Code::SettingUnknown,
                      "the part \"" + part + "\" has no setting \"" + key + "\"; it has " + known);
}

/// The own values with some of them changed by KEY=VALUE.
json::Object assigned(PartSettings settings, std::string const& part,
                      std::vector<std::string> const& assignments) {
    for (std::string const& assignment : assignments) {
        auto const equals = assignment.find('=');
        if (equals == std::string::npos)
            throw Base::Error(Base::Code::Usage,
                              "\"" + assignment + "\" is neither the only argument, a file, nor KEY=VALUE");
        std::string const key = assignment.substr(0, equals);
        requireKey(part, key, settings.values);
        settings.own.set(key, valueIn(key, assignment.substr(equals + 1), settings.values.get(key)));
    }
    return settings.own;
}

/// From a file that holds the part, or settings of a node with the part under its name.
json::Object readPart(std::string const& file, std::string const& part) {
    json::Object const document = readDocument(file);
    json::Value const named = document.get(part);
    return named.isObject() ? named.toObject() : document;
}

/// A file may be named after its node, such as "a=acme.json": what is no key of the part may be its name.
bool isFile(std::string const& what, PartSettings const& settings) {
    std::size_t const equals = what.find('=');
    return equals == std::string::npos ||
           (!settings.values.get(what.substr(0, equals)) && std::filesystem::exists(what));
}

int set(Options const& options, Terminal const& terminal) {
    auto const service = connectToService(options.service, terminal.err);
    std::string const node = nodeIdIn(options.node);
    PartSettings const settings = fetchPart(*service, node, options.part);
    json::Object const own = options.what.size() == 1 && isFile(options.what.front(), settings)
                                 ? readPart(options.what.front(), options.part)
                                 : assigned(settings, options.part, options.what);
    for (auto const& [key, value] : own)
        requireKey(options.part, key, settings.values);
    setPart(*service, node, options.part, own);
    return FINE;
}

/// The own values less some keys.
json::Object without(std::vector<std::string> const& keys, PartSettings const& settings,
                     std::string const& part) {
    json::Object left;
    for (std::string const& key : keys)
        requireKey(part, key, settings.values);
    for (auto const& [key, value] : settings.own)
        if (std::find(keys.begin(), keys.end(), key) == keys.end())
            left.set(key, value);
    return left;
}

void resetNode(Channel::Client& service, std::string const& node) {
    if (!node.empty())
        return requireNoError(service.call<Ipc::UpdateCfg>(Cfg::Id(node, false), true)->respErrMsg());
    // The service does not reset the root as a whole.
    for (SetCommand const& command : setCommands())
        setPart(service, node, command.part, json::Value());
}

int reset(Options const& options, Terminal const& terminal) {
    auto const service = connectToService(options.service, terminal.err);
    std::string const node = nodeIdIn(options.node);
    if (options.part.empty())
        resetNode(*service, node);
    else if (options.what.empty())
        setPart(*service, node, options.part, json::Value());
    else
        setPart(*service, node, options.part,
                without(options.what, fetchPart(*service, node, options.part), options.part));
    return FINE;
}

/// What setting the file would change.
int impact(Options const& options, Terminal const& terminal) {
    json::Object const own = readPart(options.what.front(), options.part);
    auto const service = connectToService(options.service, terminal.err);
    json::Object const answer =
        ask(*service, Protocol::SettingsImpactQuery(nodeIdIn(options.node), options.part, own));
    if (options.json) {
        terminal.out << answer << '\n';
        return FINE;
    }
    TextTable table({{"node"}, {"would have other values of"}});
    for (Protocol::ImpactedNode const& node : Protocol::SettingsImpactAnswer(answer).nodes)
        for (std::string const& key : node.keys)
            table.addRow({nodeInWords(node.id), key});
    if (table.empty())
        terminal.out << "nothing would have another value\n";
    else
        table.print(terminal.out);
    return FINE;
}

int remove(Options const& options, Terminal const& terminal) {
    auto const service = connectToService(options.service, terminal.err);
    requireNoError(service->call<Ipc::RemoveCfgNode>(Cfg::Id(nodeIdIn(options.node), false))->resp());
    return FINE;
}

Base::Command addCommand(Base::Command const& settings, Task& task, char const* name, char const* description,
                         int (*run)(Options const&, Terminal const&),
                         std::shared_ptr<Options> const& options) {
    Base::Command const command = settings.addCommand(name, description);
    command
        .addOption("NODE", options->node,
                   "A node like u=bob/ou=sales/a=acme, or bob/sales/acme; / is the root")
        .required();
    addServiceOptions(command, options->service);
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return run(*options, terminal); }; });
    return command;
}

} // namespace

void addSettingsChangeCommands(Base::Command const& settings, Task& task) {
    auto const options = std::make_shared<Options>();
    char const* const part = "app, inet, po, deps, profiles or presets";
    Base::Command const setting =
        addCommand(settings, task, "set", "Gives a node values of its own; the node is added when it is new",
                   &set, options);
    setting.addOption("PART", options->part, part).required();
    setting
        .addOption(
            "WHAT", options->what,
            "KEY=VALUE for each value to change, or a JSON file (- is standard input) that replaces all "
            "values of the part that the node has: the part, or settings of a node with the part among them")
        .required();
    Base::Command const resetting = addCommand(
        settings, task, "reset", "Lets a node inherit again what it has of its own", &reset, options);
    resetting.addOption("PART", options->part, std::string(part) + " [all]");
    resetting.addOption("KEY", options->what, "Settings of the part [all]");
    Base::Command const asking =
        addCommand(settings, task, "impact",
                   "Tells what would count otherwise at which nodes if \"settings set\" took the file",
                   &impact, options);
    asking.addOption("PART", options->part, part).required();
    asking.addOption("FILE", options->what, "A JSON file as \"settings set\" takes; - is standard input")
        .required();
    asking.addFlag("--json", options->json, "The service's answer as one JSON object");
    addCommand(settings, task, "remove", "Removes a node that has none below it", &remove, options);
}

} // namespace VlMail
