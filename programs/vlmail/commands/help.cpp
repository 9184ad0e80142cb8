// vlmail help: what docs/ say of a command or a topic, where the program is.
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/topics.h"
#include "programs/vlmail/terminal/text_table.h"

#include <algorithm>
#include <memory>
#include <ostream>

namespace VlMail {
namespace {

struct Found {
    std::string help;
    Manual::Topic const* topic = nullptr;
};

std::string joined(std::vector<std::string> const& words) {
    std::string text;
    for (std::string const& word : words)
        text += (text.empty() ? "" : " ") + word;
    return text;
}

Found find(Base::Command const& app, std::vector<std::string> const& words) {
    Found const found{app.helpOf(words), Manual::topicNamed(joined(words), topics())};
    if (found.help.empty() && !found.topic)
        throw Base::UsageError("there is no command or topic \"" + joined(words) +
                               "\"; vlmail help lists what there is");
    return found;
}

int listTopics(Base::CommandInfo const& program, Terminal const& terminal) {
    TextTable commands({{"command"}, {"what it does"}});
    for (Base::CommandInfo const& each : program.commands)
        commands.addRow({each.name, each.description});
    commands.print(terminal.out);
    terminal.out << "\ntopics:";
    for (Manual::Topic const& topic : topics())
        terminal.out << (topic.name.find(' ') == std::string_view::npos &&
                                 std::ranges::find(program.commands, topic.name, &Base::CommandInfo::name) ==
                                     program.commands.end()
                             ? ' ' + std::string(topic.name)
                             : std::string());
    terminal.out << "\nvlmail help COMMAND or vlmail help TOPIC tells more\n";
    return FINE;
}

int show(Found const& found, Terminal const& terminal) {
    terminal.out << found.help;
    if (found.topic)
        terminal.out << Manual::plainFrom(Manual::textOf(*found.topic));
    return FINE;
}

} // namespace

void addHelpCommand(Base::Command const& app, Task& task) {
    auto const words = std::make_shared<std::vector<std::string>>();
    Base::Command const help = app.addCommand("help", "Explains a command or a topic");
    help.addOption("TOPIC", *words, "The words of a command, or a topic; without one, lists them");
    help.whenNamed([=, &task] {
        if (words->empty())
            task = [program = app.info()](Terminal const& terminal) { return listTopics(program, terminal); };
        else
            task = [found = find(app, *words)](Terminal const& terminal) { return show(found, terminal); };
    });
}

} // namespace VlMail
