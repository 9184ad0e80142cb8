// vlmail presets test: whether documents still give what they are expected to give.
#include "programs/vlmail/commands/batch_command.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/presets.h"
#include "programs/vlmail/golden/test_run.h"
#include "programs/vlmail/letters/node_settings.h"
#include "programs/vlmail/letters/outcome.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <array>
#include <filesystem>
#include <map>
#include <memory>
#include <ostream>

namespace VlMail {
namespace {

namespace fs = std::filesystem;

/// The settings of a folder that brings its own.
constexpr char const* SETTINGS_NAME = "node.json";

struct Options {
    std::string folder;
    std::string settings;
    bool update = false;
    bool json = false;
    WorkerOptions reading;
};

struct VerdictWords {
    Verdict verdict;
    char const* word;
    /// What a count of them is called.
    char const* counted;
};

constexpr std::array VERDICTS{
    VerdictWords{Verdict::Ok, "ok", "ok"},
    VerdictWords{Verdict::Differs, "differs", "different"},
    VerdictWords{Verdict::New, "new", "without an expectation"},
    VerdictWords{Verdict::Written, "written", "written"},
    VerdictWords{Verdict::Failed, "failed", "failed"},
};

NodeSettings settingsFor(Options const& options) {
    if (!options.settings.empty())
        return NodeSettings::fromFile(options.settings);
    fs::path const own = fs::path(options.folder) / SETTINGS_NAME;
    return fs::exists(own) ? NodeSettings::fromFile(own) : NodeSettings();
}

VerdictWords const& wordsOf(Verdict verdict) {
    return *std::ranges::find(VERDICTS, verdict, &VerdictWords::verdict);
}

void print(std::ostream& out, TestCase const& one, TestResult const& result) {
    constexpr std::size_t WIDTH = 9;
    std::string word = wordsOf(result.verdict).word;
    word.resize(WIDTH, ' ');
    out << word << one.name << (result.message.empty() ? "" : ": " + result.message) << '\n';
    for (std::string const& difference : result.differences)
        out << "    " << difference << '\n';
}

json::Object toJson(TestCase const& one, TestResult const& result) {
    json::Object object{{"case", one.name}, {"verdict", wordsOf(result.verdict).word}};
    if (!result.message.empty())
        object.set("message", result.message);
    if (!result.differences.empty()) {
        json::Array differences;
        for (std::string const& difference : result.differences)
            differences.append(difference);
        object.set("differences", differences);
    }
    return object;
}

std::string countsInWords(std::map<Verdict, std::size_t> const& counts, std::size_t all) {
    std::string words;
    for (auto const& [verdict, count] : counts)
        words += (words.empty() ? ": " : ", ") + std::to_string(count) + ' ' + wordsOf(verdict).counted;
    return counted(all, "case") + words;
}

int test(Options const& options, Terminal const& terminal) {
    NodeSettings const settings = settingsFor(options);
    std::vector<TestCase> const cases = testCasesIn(options.folder);
    TestRun run(settings, options.update ? UpdateExpectations::Yes : UpdateExpectations::No);
    BatchProgress progress(terminal);
    run.readDocuments(cases, options.reading.workers(), progress);
    std::map<Verdict, std::size_t> counts;
    for (TestCase const& one : cases) {
        TestResult const result = run.run(one);
        ++counts[result.verdict];
        if (options.json)
            terminal.out << toJson(one, result) << '\n';
        else
            print(terminal.out, one, result);
    }
    if (!options.json)
        terminal.out << countsInWords(counts, cases.size()) << '\n';
    return counts[Verdict::Ok] + counts[Verdict::Written] == cases.size() ? FINE : FAILED;
}

} // namespace

void addPresetsTestCommand(Base::Command const& presets, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const command = presets.addCommand(
        "test", "Tells whether the documents in a folder still give what is expected of them");
    command.addOption("FOLDER", options->folder, "Documents, each with a file NAME.expected.json beside it")
        .required();
    command.addOption(
        "--settings", options->settings,
        "A JSON document with settings parts of a node; node.json in the folder when none is named");
    command.addFlag("--update", options->update, "Write what is found as what is expected, where it differs");
    command.addFlag("--json", options->json, "One JSON object a case, each on a line");
    addWorkerOptions(command, options->reading);
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return test(*options, terminal); }; });
}

} // namespace VlMail
