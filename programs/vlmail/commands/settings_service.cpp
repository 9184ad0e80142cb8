// vlmail settings service and suspend: the settings of the service itself, and what it holds back.
#include "programs/vlmail/commands/settings.h"

#include "programs/base/error.h"
#include "programs/protocol/service_settings.h"
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

using Protocol::SettingForm;

json::Value exampleOf(SettingForm form) {
    switch (form) {
    case SettingForm::Number:
        return 0;
    case SettingForm::List:
        return json::Array();
    default:
        return json::Object();
    }
}

json::Value parsed(std::string const& key, std::string const& text, SettingForm form) {
    if (text.empty())
        return json::Value(json_null());
    if (form == SettingForm::Text)
        return text;
    // A document is given as it is or by its file.
    if (form == SettingForm::Document && text.front() != '{')
        return readDocument(text);
    return valueIn(key, text, exampleOf(form));
}

/// "upload_folder=PATH, tariff=FILE or disabled=[...]".
std::string assignmentsInWords() {
    std::string words;
    for (Protocol::ServiceSetting const& setting : Protocol::SETTABLE)
        words += (words.empty()                                  ? ""
                  : &setting == std::end(Protocol::SETTABLE) - 1 ? " or "
                                                                 : ", ") +
                 std::string(setting.key) + '=' + setting.placeholder;
    return words;
}

json::Object changesIn(std::vector<std::string> const& assignments) {
    json::Object changes;
    for (std::string const& assignment : assignments) {
        auto const equals = assignment.find('=');
        std::string const key = assignment.substr(0, equals);
        auto const known =
            std::find_if(std::begin(Protocol::SETTABLE), std::end(Protocol::SETTABLE),
                         [&](Protocol::ServiceSetting const& setting) { return key == setting.key; });
        if (equals == std::string::npos || known == std::end(Protocol::SETTABLE))
            throw Base::Error(Base::Code::Usage,
                              "\"" + assignment + "\" sets nothing; write " + assignmentsInWords());
        changes.set(key, parsed(key, assignment.substr(equals + 1), known->form));
    }
    return changes;
}

/// Carriers that cannot be had at the moment are set all the same.
void warnOfCarriers(Channel::Client& service, json::Object const& changes, Terminal const& terminal) {
    json::Value const carriers = changes.get(Protocol::ServiceSettings::CARRIERS);
    if (!carriers.isObject())
        return;
    for (auto const& [channel, settings] : carriers.toObject()) {
        try {
            ask(service, Protocol::CarrierChange(Protocol::CarrierAction::Test, channel));
        } catch (Base::Error const& failure) {
            terminal.complain(failure.code(), std::string("the carrier of ") + channel +
                                                  " is set and cannot be had yet: " + failure.what());
        }
    }
}

int serviceSettings(Options const& options, Terminal const& terminal) {
    json::Object const changes = changesIn(options.assignments);
    auto const service = connectToService(options.service, terminal.err);
    if (!changes.empty()) {
        service->call<Ipc::SetSvcCfg>(changes);
        warnOfCarriers(*service, changes, terminal);
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

constexpr std::pair<char const*, Protocol::Suspended> SUSPENSIONS[] = {
    {"nothing", Protocol::Suspended::Nothing},
    {"settings", Protocol::Suspended::SettingsChanges},
    {"jobs", Protocol::Suspended::Jobs},
    {"all", Protocol::Suspended::All}};

int suspend(Options const& options, Terminal const& terminal) {
    auto const found = std::find_if(std::begin(SUSPENSIONS), std::end(SUSPENSIONS),
                                    [&](auto const& row) { return options.suspended == row.first; });
    if (found == std::end(SUSPENSIONS))
        throw Base::Error(Base::Code::Usage,
                          "\"" + options.suspended +
                              "\" cannot be held back; name settings, jobs, all or nothing");
    auto const service = connectToService(options.service, terminal.err);
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
        "upload_folder=PATH, tariff=FILE, carriers=FILE, disabled=[NODE...], quota={NODE: MIB...}, "
        "retention_days=N; nothing behind the sign erases it");
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
