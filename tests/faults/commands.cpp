#include "tests/faults/scenario.h"

#include "programs/vlmail/commands/command.h"
#include "vlservice/pack/pack_wrapper.h"

#include <fstream>
#include <sstream>

namespace Faults {
namespace {

namespace fs = std::filesystem;

constexpr char const* SETTINGS = R"({"presets": {
    "extract_presets": [
        {"match": "letter.*", "pack_preset": "Letters", "zones": [
            {"name": "Page", "location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700}, "fields": [
                {"name": "recipient", "value_extract": "^Mr (?<VAL>.*)$", "priority": 1, "send_to_server": true}]}]},
        {"match": "other.*", "pack_preset": "Letters"}],
    "pack_presets": [{"name": "Letters", "duplex": true}]}})";

constexpr char const* LETTER = "Acme Ltd\n\nMr John Smith\n1 High Street\nLondon\n\nDear Mr Smith,\nhello.\n";

void write(fs::path const& file, std::string const& text) { std::ofstream(file, std::ios::binary) << text; }

/// Runs vlmail while a scenario is prepared.
void vlmail(std::vector<std::string> arguments) {
    arguments.insert(arguments.begin(), "vlmail");
    std::vector<char const*> pointers;
    for (std::string const& argument : arguments)
        pointers.push_back(argument.c_str());
    std::ostringstream out;
    std::ostringstream err;
    VlMail::run(static_cast<int>(pointers.size()), pointers.data(), VlMail::Terminal{out, err});
}

void putDocuments(fs::path const& folder) {
    write(folder / "letter.txt", LETTER);
    fs::copy_file(fs::path(EXAMPLE_LETTERS) / "without-presets" / "Brief an Mustermann.pdf",
                  folder / "brief.pdf");
}

void putMailing(fs::path const& folder) {
    PackWrapper out((folder / "m.mailing").string(), PackWrapper::PURPOSE_OUTPUT, "m");
    for (char const* const page : {"1", "2", "3"}) {
        std::string const content = "%PDF-1.7 page " + std::string(page) + " %%EOF";
        out.savePage("letter.pdf", page, PageSaverI::zipDbData(content.data(), content.size()));
    }
    std::string const metadata = R"({"id":"m"})";
    out.finalizeOutput(PageSaverI::zipDbData(metadata.data(), metadata.size()));
}

void putSettings(fs::path const& folder) {
    putDocuments(folder);
    write(folder / "node.json", SETTINGS);
}

void putPlan(fs::path const& folder) {
    static std::string plan;
    putDocuments(folder);
    fs::path const file = folder / "plan.json";
    if (plan.empty()) {
        vlmail({"plan", (folder / "letter.txt").string(), "--jobs", "1", "-o", file.string()});
        std::ifstream in(file);
        plan.assign(std::istreambuf_iterator<char>(in), {});
    }
    write(file, plan);
}

} // namespace

std::vector<Command> const& commands() {
    static std::vector<Command> const all{
        {"check", {"check", "letter.txt", "brief.pdf", "--jobs", "1"}, putDocuments},
        {"help", {"help"}, putDocuments},
        {"letter", {"letter", "letter.txt", "brief.pdf", "--jobs", "1"}, putDocuments},
        {"letter_report",
         {"letter", "letter.txt", "--explain", "--json", "--report", "r.html", "--jobs", "1"},
         putDocuments},
        {"mail", {"mail", "letter.txt", "brief.pdf", "-o", "out", "--jobs", "1"}, putDocuments},
        {"plan", {"plan", "letter.txt", "-o", "p.json", "--jobs", "1"}, putDocuments},
        {"mail_plan", {"mail", "--plan", "plan.json", "-o", "out", "--jobs", "1"}, putPlan},
        {"pack_list", {"pack", "list", "m.mailing"}, putMailing},
        {"pack_verify", {"pack", "verify", "m.mailing"}, putMailing},
        {"pack_extract", {"pack", "extract", "m.mailing", "-o", "x"}, putMailing},
        {"pack_salvage", {"pack", "salvage", "m.mailing", "-o", "s.mailing"}, putMailing},
        {"presets_draft", {"presets", "draft", "letter.txt", "-o", "d.json"}, putDocuments},
        {"presets_lint", {"presets", "lint", "node.json"}, putSettings},
        {"presets_match", {"presets", "match", "letter.txt", "--settings", "node.json"}, putSettings},
        {"schema", {"schema", "settings"}, putDocuments},
        {"presets_test", {"presets", "test", ".", "--update", "--jobs", "1"}, putSettings},
    };
    return all;
}

} // namespace Faults
