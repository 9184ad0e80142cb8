// vlmail presets lint: what would go wrong with settings, before a letter does.
#include "programs/base/error.h"
#include "programs/base/read_file.h"
#include "programs/reader/document.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/presets.h"
#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/presets/lint.h"
#include "programs/vlmail/presets/words.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <memory>
#include <ostream>

namespace VlMail {
namespace {

struct Options {
    std::string settings;
    bool json = false;
};

PresetsDocument readDocument(std::string const& file) {
    std::string const text = Base::readFile(file);
    try {
        return PresetsDocument(text);
    } catch (json::Exc const& wrong) {
        throw Base::Error(Base::Code::SettingsMalformed, "cannot read the settings in " + inQuotes(file) +
                                                             ": " + wrong.what() +
                                                             "; correct the file there");
    }
}

json::Object toJson(Finding const& finding) {
    return {{"severity", inWords(finding.severity())},
            {"kind", finding.id()},
            {"place", finding.place.pointer()},
            {"what", finding.what},
            {"advice", finding.advice}};
}

void print(std::ostream& out, Finding const& finding) {
    std::string const& pointer = finding.place.pointer();
    out << inWords(finding.severity()) << ' ' << (pointer.empty() ? "(the document)" : pointer) << ": "
        << finding.what << "\n    " << finding.advice << " [" << finding.id() << "]\n";
}

int lintSettings(Options const& options, Terminal const& terminal) {
    std::vector<Finding> const findings = lint(readDocument(options.settings));
    auto const errors = static_cast<std::size_t>(std::ranges::count_if(
        findings, [](Finding const& finding) { return finding.severity() == Severity::Error; }));
    std::size_t const warnings = findings.size() - errors;
    if (options.json) {
        json::Array all;
        for (Finding const& finding : findings)
            all.append(toJson(finding));
        terminal.out << json::Object{{"file", options.settings},
                                     {"errors", errors},
                                     {"warnings", warnings},
                                     {"findings", all}}
                     << '\n';
    } else {
        for (Finding const& finding : findings)
            print(terminal.out, finding);
        terminal.out << options.settings << ": " << counted(errors, "error") << ", "
                     << counted(warnings, "warning") << '\n';
    }
    return errors == 0 ? FINE : FAILED;
}

} // namespace

void addPresetsLintCommand(Base::Command const& presets, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const command = presets.addCommand(
        "lint", "Looks settings over: what would go wrong, where, and what to do about it");
    command.addOption("NODE.json", options->settings, "A JSON document with settings parts of a node")
        .required();
    command.addFlag("--json", options->json, "One JSON object with all findings");
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return lintSettings(*options, terminal); }; });
}

} // namespace VlMail
