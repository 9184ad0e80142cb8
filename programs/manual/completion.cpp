#include "programs/manual/completion.h"

#include <functional>
#include <string_view>

namespace Manual {
namespace {

using Base::CommandInfo;
using Base::OptionInfo;

/// Calls `look` with each command and the words that name it, the program's own first.
void forEachCommand(CommandInfo const& command, std::string const& path,
                    std::function<void(std::string const&, CommandInfo const&)> const& look) {
    look(path, command);
    for (CommandInfo const& each : command.commands)
        forEachCommand(each, path + ' ' + each.name, look);
}

void forEachCommand(CommandInfo const& program,
                    std::function<void(std::string const&, CommandInfo const&)> const& look) {
    forEachCommand(program, program.name, look);
}

std::string replaced(std::string text, std::string_view what, std::string_view by) {
    for (auto at = text.find(what); at != std::string::npos; at = text.find(what, at + by.size()))
        text.replace(at, what.size(), by);
    return text;
}

/// As one word of any shell.
std::string asWord(std::string const& text) { return "'" + replaced(text, "'", "'\\''") + "'"; }

/// The same for fish, which has a quote inside quotes.
std::string asWordOfFish(std::string const& text) {
    return "'" + replaced(replaced(text, "\\", "\\\\"), "'", "\\'") + "'";
}

/// The names of commands and options, with what they are.
std::vector<std::pair<std::string, std::string>> wordsOf(CommandInfo const& command) {
    std::vector<std::pair<std::string, std::string>> words;
    for (CommandInfo const& each : command.commands)
        words.emplace_back(each.name, each.description);
    for (OptionInfo const& option : command.options)
        if (!option.isPositional())
            for (std::string const& name : option.names)
                words.emplace_back(name, option.help);
    return words;
}

/// A pattern of bash and zsh for each option of a command that has a value, or nothing.
std::string patternOfValues(std::string const& path, CommandInfo const& command) {
    std::string pattern;
    for (OptionInfo const& option : command.options)
        if (!option.isPositional() && !option.value.empty())
            for (std::string const& name : option.names)
                pattern += (pattern.empty() ? "" : "|") + asWord(path + ' ' + name);
    return pattern;
}

/// The lines by which bash and zsh find out which command the words in front of the cursor name.
std::string walk(CommandInfo const& program, std::string const& words) {
    std::string paths;
    forEachCommand(program, [&](std::string const& path, CommandInfo const&) {
        if (path != program.name)
            paths += (paths.empty() ? "" : "|") + asWord(path);
    });
    if (paths.empty())
        return {};
    return "    for word in " + words + "; do\n        case \"$path $word\" in\n        " + paths +
           ") path=\"$path $word\" ;;\n        esac\n    done\n";
}

std::string valueCases(CommandInfo const& program, std::string const& action) {
    std::string cases;
    forEachCommand(program, [&](std::string const& path, CommandInfo const& command) {
        if (std::string const pattern = patternOfValues(path, command); !pattern.empty())
            cases += "    " + pattern + ") " + action + " ;;\n";
    });
    return cases;
}

} // namespace

std::string bashCompletion(CommandInfo const& program) {
    std::string script = "# Completion of " + program.name + " in bash.\n_" + program.name +
                         "() {\n    local path=" + program.name +
                         " words= word current=${COMP_WORDS[COMP_CWORD]}\n" +
                         walk(program, "\"${COMP_WORDS[@]:1:COMP_CWORD-1}\"") +
                         "    case \"$path ${COMP_WORDS[COMP_CWORD-1]}\" in\n" +
                         valueCases(program, "mapfile -t COMPREPLY < <(compgen -f -- \"$current\"); return") +
                         "    esac\n    case $path in\n";
    forEachCommand(program, [&](std::string const& path, CommandInfo const& command) {
        std::string words;
        for (auto const& [word, help] : wordsOf(command))
            words += (words.empty() ? "" : " ") + word;
        script += "    " + asWord(path) + ") words=" + asWord(words) + " ;;\n";
    });
    return script +
           "    esac\n    COMPREPLY=($(compgen -W \"$words\" -- \"$current\"))\n"
           "    [[ $current == -* ]] || mapfile -t -O ${#COMPREPLY[@]} COMPREPLY < <(compgen -f -- "
           "\"$current\")\n}\n"
           "complete -o filenames -F _" +
           program.name + ' ' + program.name + '\n';
}

std::string zshCompletion(CommandInfo const& program) {
    std::string script = "#compdef " + program.name + "\n# Completion of " + program.name + " in zsh.\n_" +
                         program.name + "() {\n    local path_=" + program.name +
                         " word\n    local -a entries\n" +
                         replaced(walk(program, "${words[2,CURRENT-1]}"), "path", "path_") +
                         "    case \"$path_ ${words[CURRENT-1]}\" in\n" +
                         valueCases(program, "_files; return") + "    esac\n    case $path_ in\n";
    forEachCommand(program, [&](std::string const& path, CommandInfo const& command) {
        script += "    " + asWord(path) + ")\n        entries=(";
        for (auto const& [word, help] : wordsOf(command))
            script += "\n            " + asWord(replaced(word, ":", "\\:") + ':' + help);
        script += ")\n        ;;\n";
    });
    return script + "    esac\n    _describe " + program.name +
           " entries\n    [[ $PREFIX == -* ]] || _files\n}\n_" + program.name + " \"$@\"\n";
}

std::string fishCompletion(CommandInfo const& program) {
    std::string const at = "__" + program.name + "_at";
    std::string paths;
    forEachCommand(program,
                   [&](std::string const& path, CommandInfo const&) { paths += ' ' + asWord(path); });
    std::string script =
        "# Completion of " + program.name + " in fish.\nfunction " + at + "\n    set -l path " +
        program.name + "\n    for word in (commandline -opc)[2..-1]\n        if contains -- \"$path $word\"" +
        paths +
        "\n            set path \"$path $word\"\n        end\n    end\n"
        "    test \"$path\" = \"$argv[1]\"\nend\n";
    forEachCommand(program, [&](std::string const& path, CommandInfo const& command) {
        std::string const begin =
            "complete -c " + program.name + " -n " + asWordOfFish(at + " " + asWord(path));
        for (CommandInfo const& each : command.commands)
            script += begin + " -a " + each.name + " -d " + asWordOfFish(each.description) + '\n';
        for (OptionInfo const& option : command.options) {
            if (option.isPositional())
                continue;
            script += begin;
            for (std::string const& name : option.names)
                script += name.starts_with("--") ? " -l " + name.substr(2) : " -s " + name.substr(1);
            script +=
                (option.value.empty() ? "" : " -r") + std::string(" -d ") + asWordOfFish(option.help) + '\n';
        }
    });
    return script;
}

} // namespace Manual
