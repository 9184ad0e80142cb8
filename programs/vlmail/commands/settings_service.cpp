// vlmail settings service and suspend: the settings of the service itself, and what it holds back.
#include "programs/vlmail/commands/settings.h"

#include "programs/base/error.h"
#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/terminal/text_table.h"
#include "vlservice/ipc/cs_config_srv_change.h"
#include "vlservice/ipc/get_svc_cfg.h"
#include "vlservice/ipc/set_svc_cfg.h"
#include "vlservice/json/json_text.h"

#include <memory>
#include <ostream>
#include <utility>

namespace VlMail {
namespace {

struct Options {
    ServiceOptions service;
    std::vector<std::string> assignments;
    std::string suspended;
    bool json = false;
};

enum class Kind { Text, List, Document };

struct ServiceKey {
    char const* key;
    Kind kind;
};
constexpr ServiceKey SERVICE_KEYS[] = {
    {"upload_folder", Kind::Text},
    {"tariff", Kind::Document},
    {"disabled", Kind::List},
};

json::Value parsed(std::string const& key, std::string const& text, Kind kind) {
    if (text.empty())
        return json::Value(json_null());
    if (kind == Kind::Text)
        return text;
    // A document is given as it is or by its file.
    if (kind == Kind::Document && text.front() != '{')
        return readDocument(text);
    return valueIn(key, text, kind == Kind::List ? json::Value(json::Array()) : json::Value(json::Object()));
}

json::Object changesIn(std::vector<std::string> const& assignments) {
    json::Object changes;
    for (std::string const& assignment : assignments) {
        auto const equals = assignment.find('=');
        std::string const key = assignment.substr(0, equals);
        auto const known = std::find_if(std::begin(SERVICE_KEYS), std::end(SERVICE_KEYS),
                                        [&](ServiceKey const& row) { return key == row.key; });
        if (equals == std::string::npos || known == std::end(SERVICE_KEYS))
            throw Base::Error("\"" + assignment +
                              "\" sets nothing; write upload_folder=PATH, tariff=FILE or disabled=[...]");
        changes.set(key, parsed(key, assignment.substr(equals + 1), known->kind));
    }
    return changes;
}

int serviceSettings(Options const& options, Terminal const& terminal) {
    json::Object const changes = changesIn(options.assignments);
    auto const service = connectToService(options.service, terminal);
    if (!changes.empty()) {
        service->call<Ipc::SetSvcCfg>(changes);
        return FINE;
    }
    json::Object const settings = requireAnswer(service->call<Ipc::GetSvcCfg>()->resp());
    if (options.json) {
        terminal.out << settings << '\n';
        return FINE;
    }
    TextTable table({{"setting"}, {"value"}});
    for (auto const& [key, value] : settings)
        table.addRow({key, valueInWords(value)});
    table.print(terminal.out);
    return FINE;
}

constexpr std::pair<char const*, int> SUSPENSIONS[] = {
    {"nothing", 0}, {"settings", 1}, {"jobs", 2}, {"all", 3}};

int suspend(Options const& options, Terminal const& terminal) {
    auto const found = std::find_if(std::begin(SUSPENSIONS), std::end(SUSPENSIONS),
                                    [&](auto const& row) { return options.suspended == row.first; });
    if (found == std::end(SUSPENSIONS))
        throw Base::Error("\"" + options.suspended +
                          "\" cannot be held back; name settings, jobs, all or nothing");
    auto const service = connectToService(options.service, terminal);
    service->call<Ipc::CSConfigSrvChange>(static_cast<Ipc::CSConfigSrvChange::SuspendType>(found->second));
    return FINE;
}

} // namespace

void addSettingsServiceCommands(Base::Command const& settings, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const service =
        settings.addCommand("service", "Shows or changes the settings of the service itself");
    service.addOption(
        "KEY=VALUE", options->assignments,
        "upload_folder=PATH, tariff=FILE, disabled=[NODE...]; nothing behind the sign erases it");
    service.addFlag("--json", options->json, "The settings as one JSON object");
    addServiceOptions(service, options->service);
    service.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return serviceSettings(*options, terminal); }; });
    Base::Command const suspending =
        settings.addCommand("suspend", "Has the service hold back changes or jobs");
    suspending.addOption("WHAT", options->suspended, "settings, jobs, all or nothing").required();
    addServiceOptions(suspending, options->service);
    suspending.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return suspend(*options, terminal); }; });
}

} // namespace VlMail
