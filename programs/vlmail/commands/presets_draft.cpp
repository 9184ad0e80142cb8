// vlmail presets draft: a preset to begin with, made of letters that it is to read.
#include "programs/base/error.h"
#include "programs/base/private_file.h"
#include "programs/base/quoting.h"
#include "programs/base/utf8.h"
#include "programs/vlmail/commands/batch_command.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/presets.h"
#include "programs/vlmail/letters/batch.h"
#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/letters/worker_pool.h"
#include "programs/vlmail/presets/draft.h"
#include "vlservice/json/json_text.h"

#include <cstdlib>
#include <filesystem>
#include <memory>
#include <new>
#include <ostream>
#include <sstream>
#include <string>
#include <utility>
#include <variant>
#include <vector>

namespace VlMail {
namespace {

struct Options {
    std::vector<std::string> files;
    std::string output;
    WorkerOptions reading;
};

std::string printed(json::Object const& settings) {
    std::unique_ptr<char, decltype(&std::free)> const text(json_dumps(settings.node(), JSON_INDENT(2)),
                                                           std::free);
    if (!text)
        throw std::bad_alloc();
    return std::string(text.get()) + '\n';
}

Base::Error standsAlready(std::string const& file) {
    return Base::Error(Base::Code::FileExists, "there is a file " + Base::inQuotes(file) +
                                                   " already; name another one, or remove it");
}

constexpr char const* SETTINGS = "settings";
constexpr char const* EVIDENCE = "evidence";
constexpr char const* ERROR = "error";

json::Object drafted(std::vector<std::string> const& files) {
    std::vector<Reader::Document> documents;
    for (std::string const& file : files)
        documents.push_back(Reader::openDocument(std::filesystem::path(file)));
    Draft const draft = draftFrom(documents);
    json::Array evidence;
    for (std::string const& line : draft.evidence)
        evidence.append(line);
    return {{SETTINGS, draft.settings}, {EVIDENCE, evidence}};
}

/// What a worker hands over.
std::string draftedOrFailed(std::vector<std::string> const& files) {
    std::ostringstream text;
    try {
        text << drafted(files);
    } catch (std::bad_alloc const&) {
        throw;
    } catch (std::exception const& failure) {
        text << json::Object{{ERROR, Base::validUtf8(failure.what())}};
    }
    return std::move(text).str();
}

/// Documents from anywhere are read in a process of their own, which may take so much for each.
json::Object draftInWorker(Options const& options) {
    Workers workers = options.reading.workers();
    workers.limits.processor *= static_cast<int>(options.files.size());
    std::string text;
    runJobs(
        1, workers, [&](std::size_t) { return draftedOrFailed(options.files); },
        [&](std::size_t, JobResult result) {
            auto const* const failure = std::get_if<JobFailure>(&result);
            if (failure && *failure == JobFailure::NoMemory)
                throw std::bad_alloc();
            if (failure)
                throw Base::Error(Base::Code::LimitExceeded, "cannot make a draft of " +
                                                                 counted(options.files.size(), "document") +
                                                                 ": " + inWords(*failure, workers.limits));
            text = std::get<std::string>(std::move(result));
        });
    json::Object const draft = json::strToObject(text.data(), text.size());
    if (draft.get(ERROR))
        throw Base::Error(Base::Code::DocumentUnreadable, draft.get(ERROR).toString());
    return draft;
}

int draft(Options const& options, Terminal const& terminal) {
    if (std::filesystem::exists(options.output))
        throw standsAlready(options.output);
    json::Object const draft = draftInWorker(options);
    if (!Base::createPrivateFile(options.output, printed(draft.get(SETTINGS).toObject())))
        throw standsAlready(options.output);
    for (json::Value const& line : draft.get(EVIDENCE).toArray())
        terminal.out << line.toString() << '\n';
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
    addLimitOptions(command, options->reading);
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return draft(*options, terminal); }; });
}

} // namespace VlMail
