// vlmail check: what would go wrong with letters on paper, for a person or as JSON.
#include "programs/vlmail/commands/batch_command.h"
#include "programs/vlmail/commands/batch_sources.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/letters/batch.h"
#include "programs/vlmail/letters/checking.h"
#include "programs/vlmail/letters/making_ready.h"
#include "programs/vlmail/letters/node_settings.h"
#include "programs/vlmail/letters/outcome.h"
#include "vlservice/json/json_text.h"

#include <memory>
#include <ostream>

namespace VlMail {
namespace {

struct Options {
    std::vector<std::string> files;
    SourceOptions sources;
    bool json = false;
    WorkerOptions reading;
};

void print(std::ostream& out, LetterReading const& letter, std::size_t number, std::size_t of) {
    std::string const why = letter.whyNot();
    bool const isFound = !letter.findings.empty() && letter.findings.front().isError();
    out << "  letter " << number << " of " << of << ", " << pagesInWords(letter.pages) << ": "
        << (why.empty() ? "ready"
            : isFound   ? "cannot go out"
                        : "cannot go out: " + why)
        << '\n';
    for (Production::Finding const& finding : letter.findings)
        out << linesFor(finding, 4);
    if (!letter.coverAddress.empty())
        out << "    a cover page with the address goes in front\n";
}

void print(std::ostream& out, DocumentReading const& reading) {
    if (reading.failed())
        return;
    out << reading.document << '\n';
    if (reading.isAttachment())
        out << "  an attachment: it holds no letters\n";
    else
        for (std::size_t i = 0; i < reading.letters->size(); ++i)
            print(out, (*reading.letters)[i], i + 1, reading.letters->size());
}

/// Each letter says what was found, even if it is nothing.
json::Object toJson(DocumentReading const& reading) {
    json::Object document = reading.toJson();
    if (reading.failed() || reading.isAttachment())
        return document;
    json::Array letters;
    for (json::Value const& value : document.get("letters").toArray()) {
        json::Object letter = value.toObject();
        if (!letter.get("findings"))
            letter.set("findings", json::Array());
        letters.append(letter);
    }
    document.set("letters", letters);
    return document;
}

int checkDocuments(Options const& options, Terminal const& terminal) {
    BatchSources sources(options.sources, terminal);
    NodeSettings const settings = sources.settings();
    Outcome outcome;
    BatchProgress progress(terminal);
    MakingReady making(MakingReady::Colours::Ignored);
    making.prepareFor(options.files, settings.presets(), sources.documents(), options.reading.workers());
    readBatch(options.files, settings, options.reading.workers(),
              {.checks = Along::Checks::Yes, .limits = Along::Limits::Yes, .making = &making}, progress,
              [&](std::size_t, ReadResult const& result) {
                  outcome.count(result.reading);
                  if (options.json)
                      terminal.out << toJson(result.reading) << std::endl;
                  else
                      print(terminal.out, result.reading);
                  if (result.reading.failed())
                      terminal.complain(result.reading.code, result.reading.error);
              });
    if (!options.json)
        terminal.out << outcome.inWords() << '\n';
    return exitStatusOf(outcome.end());
}

} // namespace

void addCheckCommand(Base::Command const& app, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const check =
        app.addCommand("check", "Says what would go wrong with the letters in documents on paper");
    check.addOption("FILE", options->files, "PDF or text documents").required();
    addSourceOptions(check, options->sources);
    check.addFlag("--json", options->json,
                  "One JSON object a document, each on a line, with the \"findings\" of each letter");
    addWorkerOptions(check, options->reading);
    check.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return checkDocuments(*options, terminal); }; });
}

} // namespace VlMail
