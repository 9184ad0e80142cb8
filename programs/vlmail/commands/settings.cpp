// vlmail settings: the settings of the nodes, as the service keeps them.
#include "programs/vlmail/commands/settings.h"
#include "programs/base/error.h"
#include "programs/base/json_schema.h"
#include "programs/base/read_file.h"

#include "vlservice/cfg/id.h"
#include "vlservice/json/json_text.h"

#include <sstream>

namespace VlMail {

std::string nodeIdIn(std::string const& text) {
    if (text.empty() || text == "/")
        return {};
    // An id that ends in a slash is complete, and completing it again would change it.
    return text.back() == '/' ? text : Cfg::Id(text.c_str()).str();
}

std::string nodeInWords(std::string const& id) { return id.empty() ? "the root" : id; }

Protocol::SettingsAnswer fetchSettings(Channel::Client& service, std::string const& nodeId,
                                       std::vector<std::string> const& parts) {
    return Protocol::SettingsAnswer(ask(service, Protocol::SettingsQuery(nodeId, parts)));
}

std::string valueInWords(json::Value const& value) {
    if (value.isString())
        return value.textOrEmpty();
    std::ostringstream text;
    text << value;
    return text.str();
}

json::Value valueIn(std::string const& key, std::string const& text, json::Value const& model) {
    if (model.isString())
        return text;
    // The parser takes objects alone.
    std::string const document = "{\"v\":" + text + '}';
    try {
        return json::strToObject(document.data(), document.size()).get("v");
    } catch (json::Exc const&) {
        throw Base::Error(Base::Code::SettingInvalid, "\"" + key + "\" wants a value in JSON like " +
                                                          valueInWords(model) + ", and \"" + text +
                                                          "\" is none");
    }
}

json::Object readDocument(std::string const& file) {
    std::string const text = file == "-" ? Base::readStandardInput() : Base::readFile(file);
    try {
        // Editors alone look at the name of the schema.
        return Base::Schema::without(json::strToObject(text.data(), text.size()), Base::Schema::KEY);
    } catch (json::Exc const& wrong) {
        throw Base::Error(Base::Code::SettingsMalformed,
                          "cannot use \"" + file + "\": " + wrong.what() + "; correct the file there");
    }
}

void addSettingsCommand(Base::Command const& app, Task& task) {
    Base::Command const settings =
        app.addCommand("settings", "Shows and changes the settings that the service keeps");
    settings.requireCommand();
    addSettingsShowCommand(settings, task);
    addSettingsChangeCommands(settings, task);
    addSettingsTreeCommand(settings, task);
    addSettingsServiceCommands(settings, task);
}

} // namespace VlMail
