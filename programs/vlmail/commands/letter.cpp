// vlmail letter: what the settings make of each document, for a person or as JSON.
#include "programs/vlmail/commands/batch_command.h"
#include "programs/vlmail/commands/batch_sources.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/explain/explain.h"
#include "programs/vlmail/explain/explain_text.h"
#include "programs/vlmail/letters/batch.h"
#include "programs/vlmail/letters/checking.h"
#include "programs/vlmail/letters/field_words.h"
#include "programs/vlmail/letters/making_ready.h"
#include "programs/vlmail/letters/node_settings.h"
#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/report/describe.h"
#include "programs/vlmail/report/report_file.h"
#include "programs/vlmail/terminal/text_table.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <memory>
#include <optional>
#include <ostream>

namespace VlMail {
namespace {

struct Options {
    std::vector<std::string> files;
    SourceOptions sources;
    std::string report;
    bool json = false;
    bool explain = false;
    WorkerOptions reading;
};

std::string stateInWords(Cfg::ExtractedField const& field) {
    switch (field.valueType()) {
    case Cfg::ExtractedField::ValueType::NotValidated:
        return "not validated";
    case Cfg::ExtractedField::ValueType::Plain:
        return "ok";
    case Cfg::ExtractedField::ValueType::Time:
        return "date";
    case Cfg::ExtractedField::ValueType::Invalid:
        break;
    }
    return "INVALID";
}

std::string linesJoined(std::string text) {
    for (std::size_t at = text.find('\n'); at != std::string::npos; at = text.find('\n', at))
        text.replace(at, 1, " / ");
    return text;
}

void print(std::ostream& out, LetterReading const& letter, std::size_t number, std::size_t of) {
    std::string const why = letter.whyNot();
    out << "  letter " << number << " of " << of << ", " << pagesInWords(letter.pages) << ": "
        << (why.empty() ? "ready" : "cannot go out: " + why) << '\n';
    TextTable table({{"field"}, {"value"}, {"state"}, {"address"}});
    for (auto const& [priority, field] : letter.fields)
        table.addRow({field.name(), linesJoined(field.valueToStr()), stateInWords(field),
                      roleInWords(field, &field == letter.fields.primaryAddressField())});
    if (table.empty())
        out << "    no field was found\n";
    else
        table.print(out, 4);
    for (std::string const& name : letter.missing)
        out << "    missing, although obligatory: " << name << '\n';
    for (std::string const& warning : letter.warnings)
        out << "    look at " << warning << '\n';
    for (Production::Finding const& finding : letter.findings)
        out << linesFor(finding, 4);
    if (!letter.coverAddress.empty())
        out << "    a cover page with the address goes in front\n";
}

void printLetters(std::ostream& out, DocumentReading const& reading) {
    out << reading.document << '\n'
        << "  read by the preset for  " << reading.extractPreset << '\n'
        << "  sent by the pack preset " << reading.packPreset << '\n';
    if (reading.isAttachment()) {
        out << "  an attachment: it holds no letters\n";
        return;
    }
    for (std::size_t i = 0; i < reading.letters->size(); ++i)
        print(out, (*reading.letters)[i], i + 1, reading.letters->size());
}

/// The answer, then the evidence. Of a document that failed there may be evidence alone.
void print(std::ostream& out, DocumentReading const& reading) {
    if (reading.failed() && !reading.trace)
        return;
    if (reading.failed())
        out << reading.document << '\n';
    else
        printLetters(out, reading);
    if (reading.trace)
        printExplanation(out, reading.trace.toObject());
    out << '\n';
}

void explain(ReadResult& result, OpenDocument const& read) {
    json::Object explanation = result.reading.trace.toObject();
    explainPages(explanation, read.document, read.preset, Reader::ReadingRules::of(read.packPreset),
                 read.trace);
    result.reading.trace = explanation;
}

std::string sectionOf(DocumentReading const& reading, OpenDocument const& read, MakingReady& making) {
    Report::PrintedPages pages(read.document, read.packPreset, making);
    return Report::section(Report::describe(reading, pages, read.trace), read.place);
}

/// What the options want to know beside the letters.
Along alongFor(Options const& options, MakingReady* making) {
    Along along;
    along.making = making;
    along.checks = Along::Checks::Yes;
    along.limits = Along::Limits::Yes;
    if (options.explain)
        along.beforeReading = [](ReadResult& result, Cfg::Presets const& presets) {
            result.reading.trace = explainPresets(presets, result.reading.document);
        };
    if (options.explain || !options.report.empty())
        along.afterReading = [=](ReadResult& result, OpenDocument const& read) {
            if (options.explain)
                explain(result, read);
            if (!options.report.empty())
                result.report = sectionOf(result.reading, read, *making);
        };
    return along;
}

int showLetters(Options const& options, Terminal const& terminal) {
    BatchSources sources(options.sources, terminal);
    NodeSettings const settings = sources.settings();
    Outcome outcome;
    std::optional<Report::File> report;
    if (!options.report.empty())
        report.emplace(options.report);
    MakingReady making(MakingReady::Colours::Ignored);
    making.prepareFor(options.files, settings.presets(), sources.documents(), options.reading.workers());
    Along const along = alongFor(options, &making);
    BatchProgress progress(terminal);
    readBatch(options.files, settings, options.reading.workers(), along, progress,
              [&](std::size_t, ReadResult result) {
                  DocumentReading const& reading = result.reading;
                  outcome.count(reading);
                  if (options.json)
                      terminal.out << reading.toJson() << std::endl;
                  else
                      print(terminal.out, reading);
                  if (reading.failed())
                      terminal.complain(reading.code, reading.error);
                  if (report)
                      report->take(result);
              });
    if (report)
        report->write(outcome);
    if (!options.json && options.files.size() > 1)
        terminal.out << outcome.inWords() << '\n';
    return exitStatusOf(outcome.end());
}

} // namespace

void addLetterCommand(Base::Command const& app, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const letter = app.addCommand(
        "letter", "Shows the letters in documents: presets, fields, and whether they can go out");
    letter.addOption("FILE", options->files, "PDF or text documents").required();
    addSourceOptions(letter, options->sources);
    letter.addFlag("--json", options->json, "One JSON object a document, each on a line");
    letter.addFlag("--explain", options->explain,
                   "Tells how each field came about, and why one was not found; with --json as \"trace\"");
    letter.addOption("--report", options->report,
                     "Writes an HTML page with the pages' pictures and what was found where");
    addWorkerOptions(letter, options->reading);
    letter.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return showLetters(*options, terminal); }; });
}

} // namespace VlMail
