// vlmail help: what docs/ say of a command or a topic, where the program is.
#include "programs/manual/markdown.h"
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
    /// What pages say of a code.
    std::string code = {};
};

/// Whose tables explain codes: of failures, and of findings.
constexpr char const* PAGES_WITH_CODES[] = {"errors.md", "check.md", "settings.md", "letters-and-mailings.md",
                                            "presets-tools.md"};

/// "CODE", and what each column behind it says; empty unless it is a row of the table.
std::string explanationIn(Manual::Table const& table, std::string const& code) {
    std::string text;
    for (std::vector<std::string> const& row : table.rows) {
        if (row.front() != '`' + code + '`')
            continue;
        text = code + "\n";
        for (std::size_t i = 1; i < row.size(); ++i)
            text += '\n' + Manual::plainFrom(table.head[i] + ": " + row[i]);
    }
    return text;
}

std::string explanationOf(std::string const& code) {
    for (char const* page : PAGES_WITH_CODES)
        for (Manual::Table const& table : Manual::tablesOf(Manual::textOf({"", page, ""})))
            if (std::string text = explanationIn(table, code); !text.empty())
                return text;
    return {};
}

std::string joined(std::vector<std::string> const& words) {
    std::string text;
    for (std::string const& word : words)
        text += (text.empty() ? "" : " ") + word;
    return text;
}

Found find(Base::Command const& app, std::vector<std::string> const& words) {
    Found found{app.helpOf(words), Manual::topicNamed(joined(words), topics())};
    if (found.help.empty() && !found.topic)
        found.code = explanationOf(joined(words));
    if (found.help.empty() && !found.topic && found.code.empty())
        throw Base::UsageError("there is no command, topic or code \"" + joined(words) +
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
    terminal.out << "\nvlmail help COMMAND or vlmail help TOPIC tells more, and vlmail help CODE what to do "
                    "about an error\n";
    return FINE;
}

int show(Found const& found, Terminal const& terminal) {
    terminal.out << found.help << found.code;
    if (found.topic)
        terminal.out << Manual::plainFrom(Manual::textOf(*found.topic));
    return FINE;
}

} // namespace

void addHelpCommand(Base::Command const& app, Task& task) {
    auto const words = std::make_shared<std::vector<std::string>>();
    Base::Command const help = app.addCommand("help", "Explains a command, a topic or the code of an error");
    help.addOption("TOPIC", *words,
                   "The words of a command, a topic or a code; without one, lists commands and topics");
    help.whenNamed([=, &task] {
        if (words->empty())
            task = [program = app.info()](Terminal const& terminal) { return listTopics(program, terminal); };
        else
            task = [found = find(app, *words)](Terminal const& terminal) { return show(found, terminal); };
    });
}

} // namespace VlMail
