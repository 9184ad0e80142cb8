// vlmail settings show: what counts at a node, and where each value comes from.
#include "programs/base/utf8.h"
#include "programs/vlmail/commands/settings.h"

#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/terminal/text_table.h"
#include "vlservice/json/json_text.h"

#include <memory>
#include <ostream>
#include <utility>

namespace VlMail {
namespace {

struct Options {
    ServiceOptions service;
    std::string node;
    std::vector<std::string> parts;
    bool origin = false;
    bool json = false;
};

/// Longer values are cut in tables.
constexpr std::size_t MAX_VALUE_BYTES = 60;

std::string cut(std::string const& text) {
    std::string_view const start = Base::firstBytes(text, MAX_VALUE_BYTES);
    return start.size() == text.size() ? text : std::string(start) + "...";
}

/// The id of a node, or JSON null for a value that is built in.
std::string originInWords(json::Value const& origin) {
    if (!origin.isString())
        return "built in";
    std::string const id = origin.textOrEmpty();
    return id.empty() ? "root" : id;
}

class SettingsTable {
public:
    explicit SettingsTable(bool withOrigin) : withOrigin_(withOrigin), table_(columns(withOrigin)) {}

    void add(std::string const& part, Protocol::PartSettings const& settings) {
        for (auto const& [key, value] : settings.values) {
            json::Value const origin = settings.origins.get(key);
            // A list that is inherited by elements has an origin for each.
            if (origin.isArray())
                addElements(part, key, value.toArray(), origin.toArray());
            else
                addRow(part, key, value, origin);
        }
    }
    void print(std::ostream& out) const { table_.print(out); }

private:
    static std::vector<TextTable::Column> columns(bool withOrigin) {
        std::vector<TextTable::Column> columns{{"part"}, {"setting"}, {"value"}};
        if (withOrigin)
            columns.push_back({"from"});
        return columns;
    }

    void addElements(std::string const& part, std::string const& key, json::Array const& list,
                     json::Array const& origins) {
        for (std::size_t i = 0; i < list.size(); ++i)
            addRow(part, key + '[' + std::to_string(i) + ']', list.at(i), origins.at(i));
    }
    void addRow(std::string const& part, std::string const& key, json::Value const& value,
                json::Value const& origin) {
        std::vector<std::string> cells{part, key, cut(valueInWords(value))};
        if (withOrigin_)
            cells.push_back(originInWords(origin));
        table_.addRow(std::move(cells));
    }

    bool withOrigin_;
    TextTable table_;
};

int showSettings(Options const& options, Terminal const& terminal) {
    auto const service = connectToService(options.service, terminal.err);
    Protocol::SettingsAnswer const answer = fetchSettings(*service, nodeIdIn(options.node), options.parts);
    if (options.json) {
        terminal.out << answer.serialize() << '\n';
        return FINE;
    }
    SettingsTable table(options.origin);
    for (auto const& [part, settings] : answer.parts)
        table.add(part, Protocol::PartSettings(settings.toObject()));
    table.print(terminal.out);
    if (!answer.known)
        terminal.out << nodeInWords(answer.id) << " has no settings yet: all of this is inherited\n";
    return FINE;
}

} // namespace

void addSettingsShowCommand(Base::Command const& settings, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const show = settings.addCommand("show", "Shows what counts at a node");
    show.addOption("NODE", options->node,
                   "A node like u=bob/ou=sales/a=acme, or bob/sales/acme; / is the root")
        .required();
    show.addOption("PART", options->parts, "app, inet, po, deps, profiles, presets [all]");
    show.addFlag("--origin", options->origin, "Show which node each value comes from");
    show.addFlag("--json", options->json,
                 "The service's answer, with all values and origins, as one JSON object");
    addServiceOptions(show, options->service);
    show.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return showSettings(*options, terminal); }; });
}

} // namespace VlMail
