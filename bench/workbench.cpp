// What a person at the workbench waits for: a changed pattern until its effect is there, against `vlmail
// letter
// --explain --report` as a process over the same document, and a folder of a thousand documents until the
// first of them is shown, against a folder of one. Decides whether what was read is worth keeping. The aims
// are a third and twice. Shortest times by the clock, in turns, since what is asked goes to another process.
#include "bench/process_time.h"
#include "programs/base/read_file.h"
#include "programs/vlmail/workbench/session.h"
#include "tests/support/temporary_folder.h"
#include "vlservice/json/json_text.h"

#include <benchmark/benchmark.h>

#include <boost/asio/io_context.hpp>

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <utility>

namespace {

namespace fs = std::filesystem;
namespace Workbench = VlMail::Workbench;
using Clock = std::chrono::steady_clock;

constexpr char const* DOCUMENT = "Invoice 17.pdf";
constexpr int MANY = 1000;

fs::path example(char const* name) { return fs::path(VLSERVICE_OFFICE) / name; }
std::string settings() { return Base::readFile(example("settings.json")); }

class AtTheWorkbench {
public:
    explicit AtTheWorkbench(fs::path folder)
        : session_(io_, {std::move(folder)}, {}, Workbench::settingsInFile(example("settings.json"))) {}

    void ask(std::string const& what, json::Object const& query) {
        std::optional<Workbench::Answer> got;
        session_.answer(what, json::toText(query), [&](Workbench::Answer one) { got = std::move(one); });
        while (!got)
            io_.run_one();
        if (got->status != 200)
            throw std::runtime_error(got->body);
    }
    void evaluate(std::string const& document, std::string const& text) {
        json::Object query;
        query.set("document", document);
        query.set("settings", text);
        ask("evaluate", query);
    }

private:
    boost::asio::io_context io_{1};
    Workbench::Session session_;
};

template<typename Operation>
double secondsOf(Operation operation) {
    auto const begin = Clock::now();
    operation();
    return std::chrono::duration<double>(Clock::now() - begin).count();
}

/// The settings with a pattern that they never had.
std::string changed(std::string text, int times) {
    std::string const digits = "[\\\\d-]+";
    std::size_t const at = text.find(digits);
    if (at == std::string::npos)
        throw std::runtime_error("the pattern of the invoice's number is another");
    return text.replace(at, digits.size(), "[\\\\d-]{1," + std::to_string(20 + times) + '}');
}

void changeOfAPattern(benchmark::State& state) {
    TemporaryFolder const folder;
    AtTheWorkbench workbench(VLSERVICE_OFFICE);
    std::string const text = settings();
    workbench.evaluate(DOCUMENT, text);
    double change = 1e9;
    double process = 1e9;
    int times = 0;
    for (auto _ : state) {
        std::string const other = changed(text, ++times);
        change = std::min(change, secondsOf([&] { workbench.evaluate(DOCUMENT, other); }));
        process =
            std::min(process, secondsOf([&] {
                         Bench::secondsOf({VLSERVICE_VLMAIL, "letter", "--explain", "--report",
                                           (folder.path() / "report.html").string(), "--settings",
                                           example("settings.json").string(), example(DOCUMENT).string()});
                     }));
    }
    state.counters["change_ms"] = change * 1e3;
    state.counters["process_ms"] = process * 1e3;
    state.counters["ratio"] = change / process;
}

/// With so many documents.
double opened(fs::path const& folder) {
    return secondsOf([&] {
        AtTheWorkbench workbench(folder);
        workbench.ask("state", {});
        workbench.evaluate("invoice 0.pdf", settings());
    });
}

void fill(fs::path const& folder, int documents) {
    fs::create_directory(folder);
    for (int i = 0; i < documents; ++i)
        fs::copy_file(example(DOCUMENT), folder / ("invoice " + std::to_string(i) + ".pdf"));
}

void openAFolder(benchmark::State& state) {
    TemporaryFolder const folders;
    fs::path const one = folders.path() / "one";
    fs::path const many = folders.path() / "many";
    fill(one, 1);
    fill(many, MANY);
    double first = 1e9;
    double ofMany = 1e9;
    for (auto _ : state) {
        first = std::min(first, opened(one));
        ofMany = std::min(ofMany, opened(many));
    }
    state.counters["one_ms"] = first * 1e3;
    state.counters["thousand_ms"] = ofMany * 1e3;
    state.counters["ratio"] = ofMany / first;
}

BENCHMARK(changeOfAPattern)->Unit(benchmark::kMillisecond)->UseRealTime()->MinTime(4);
BENCHMARK(openAFolder)->Unit(benchmark::kMillisecond)->UseRealTime()->MinTime(4);

} // namespace

BENCHMARK_MAIN();
