#include "programs/manual/man_page.h"

#include "programs/manual/markdown.h"

#include <algorithm>
#include <cctype>
#include <sstream>

namespace Manual {
namespace {

using Base::CommandInfo;
using Base::OptionInfo;

/// Nothing in the text is taken for a request or a hyphen between words.
std::string escaped(std::string const& text) {
    std::string roff;
    for (char const c : text) {
        if ((c == '.' || c == '\'') && (roff.empty() || roff.back() == '\n'))
            roff += "\\&";
        if (c == '\\')
            roff += "\\e";
        else if (c == '-')
            roff += "\\-";
        else
            roff += c;
    }
    return roff;
}

std::string joined(std::vector<std::string> const& words, char const* between) {
    std::string text;
    for (std::string const& word : words)
        text += (text.empty() ? "" : between) + word;
    return text;
}

std::string inCapitals(std::string text) {
    std::transform(text.begin(), text.end(), text.begin(),
                   [](unsigned char c) { return static_cast<char>(std::toupper(c)); });
    return text;
}

std::string bold(std::string const& text) { return "\\fB" + escaped(text) + "\\fR"; }
std::string italic(std::string const& text) { return "\\fI" + escaped(text) + "\\fR"; }

std::string marked(std::string const& text) {
    std::string roff;
    for (Span const& span : spansOf(text))
        roff += span.isMarked ? bold(span.text) : escaped(span.text);
    return roff;
}

std::string inRoff(Block const& block) {
    std::string text = marked(block.text) + '\n';
    switch (block.kind) {
    case Block::Kind::Heading:
        return ".SS " + text;
    case Block::Kind::Item:
        return ".IP \\(bu 2\n" + text;
    case Block::Kind::Code:
        return ".PP\n.nf\n" + escaped(block.text) + ".fi\n";
    case Block::Kind::Row:
        for (std::string const& cell : block.cells)
            text += marked(cell) + (&cell == &block.cells.back() ? "\n" : ";\n");
        return ".TP\n" + text;
    case Block::Kind::Paragraph:
        break;
    }
    return ".PP\n" + text;
}

std::string inSynopsis(OptionInfo const& option) {
    std::string text = option.isPositional() ? italic(option.names.front()) : bold(option.names.back());
    if (!option.isPositional() && !option.value.empty())
        text += ' ' + italic(option.value);
    if (option.takesMany)
        text += "...";
    return option.isRequired ? text : '[' + text + ']';
}

bool isAskedForHelp(OptionInfo const& option) { return option.names.back() == "--help"; }

void writeSynopsis(std::ostream& out, std::vector<std::string> const& path, CommandInfo const& command) {
    out << ".SH SYNOPSIS\n" << bold(joined(path, " "));
    for (OptionInfo const& option : command.options)
        if (!isAskedForHelp(option))
            out << '\n' << inSynopsis(option);
    if (!command.commands.empty())
        out << '\n' << italic("COMMAND") << " ...";
    out << '\n';
}

void writeOption(std::ostream& out, OptionInfo const& option) {
    out << ".TP\n";
    std::string names;
    for (std::string const& name : option.names)
        names += (names.empty() ? "" : ", ") + (option.isPositional() ? italic(name) : bold(name));
    out << names;
    if (!option.isPositional() && !option.value.empty())
        out << ' ' << italic(option.value);
    out << '\n' << escaped(option.help);
    if (!option.standard.empty())
        out << " [" << escaped(option.standard) << ']';
    out << '\n';
}

void writeOptions(std::ostream& out, CommandInfo const& command) {
    out << ".SH OPTIONS\n";
    for (OptionInfo const& option : command.options)
        writeOption(out, option);
}

void writeCommands(std::ostream& out, std::vector<std::string> const& path, CommandInfo const& command,
                   Book const& book) {
    if (command.commands.empty())
        return;
    out << ".SH COMMANDS\n";
    for (CommandInfo const& each : command.commands)
        out << ".TP\n"
            << bold(joined(path, "-") + '-' + each.name) << '(' << book.section << ")\n"
            << escaped(each.description) << '\n';
}

void writeSeeAlso(std::ostream& out, std::vector<std::string> const& path, Book const& book) {
    if (path.size() == 1)
        return;
    out << ".SH SEE ALSO\n"
        << bold(joined({path.begin(), path.end() - 1}, "-")) << '(' << book.section << ")\n";
}

} // namespace

std::string manPage(std::vector<std::string> const& path, CommandInfo const& command,
                    std::vector<Section> const& more, Book const& book) {
    std::ostringstream out;
    std::string const name = joined(path, "-");
    out << ".TH " << inCapitals(escaped(name)) << ' ' << book.section << " \"\" \"" << book.source << "\"\n"
        << ".SH NAME\n"
        << escaped(name) << " \\- " << escaped(command.description) << '\n';
    writeSynopsis(out, path, command);
    writeOptions(out, command);
    writeCommands(out, path, command, book);
    for (Section const& section : more) {
        out << ".SH " << inCapitals(escaped(section.heading)) << '\n';
        for (Block const& block : blocksOf(section.markdown))
            out << inRoff(block);
    }
    writeSeeAlso(out, path, book);
    return out.str();
}

std::string manFileName(std::vector<std::string> const& path, Book const& book) {
    return joined(path, "-") + '.' + std::to_string(book.section);
}

} // namespace Manual
