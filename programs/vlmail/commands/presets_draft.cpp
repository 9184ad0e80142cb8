// vlmail presets draft: a preset to begin with, made of letters that it is to read.
#include "programs/base/error.h"
#include "programs/base/private_file.h"
#include "programs/base/quoting.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/presets.h"
#include "programs/vlmail/presets/draft.h"

#include <cstdlib>
#include <filesystem>
#include <memory>
#include <ostream>

namespace VlMail {
namespace {

struct Options {
    std::vector<std::string> files;
    std::string output;
};

std::string printed(json::Object const& settings) {
    std::unique_ptr<char, decltype(&std::free)> const text(json_dumps(settings.node(), JSON_INDENT(2)),
                                                           std::free);
    return std::string(text.get()) + '\n';
}

Base::Error standsAlready(std::string const& file) {
    return Base::Error("there is a file " + Base::inQuotes(file) +
                       " already; name another one, or remove it");
}

int draft(Options const& options, Terminal const& terminal) {
    if (std::filesystem::exists(options.output))
        throw standsAlready(options.output);
    std::vector<Reader::Document> documents;
    for (std::string const& file : options.files)
        documents.push_back(Reader::openDocument(std::filesystem::path(file)));
    Draft const draft = draftFrom(documents);
    if (!Base::createPrivateFile(options.output, printed(draft.settings)))
        throw standsAlready(options.output);
    for (std::string const& line : draft.evidence)
        terminal.out << line << '\n';
    terminal.out << options.output << ": a draft; look at what it reads with \"vlmail letter --settings "
                 << options.output << "\"\n";
    return FINE;
}

} // namespace

void addPresetsDraftCommand(Base::Command const& presets, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const command = presets.addCommand(
        "draft", "Makes a preset to begin with out of letters, and tells what it saw in them");
    command.addOption("FILE", options->files, "PDF or text documents that the preset is to read").required();
    command
        .addOption("-o,--output", options->output, "The settings to write; never over a file that is there")
        .valueName("NODE.json")
        .required();
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return draft(*options, terminal); }; });
}

} // namespace VlMail
