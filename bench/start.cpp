// What it takes to start vlmail, against a program that is linked with the same libraries, has all of them
// loaded and does nothing else, in turns. Decides which libraries are worth loading late
// (cmake/LateProgram.cmake). The aim is 1.5 times for "--version" and for a letter of one page, typed in
// "letter", a PDF in "pdf_least", "pdf" and "pdf_most": those of the example letters that take the least, one
// in the middle, and the most. What poppler takes to read and draw a page is in "page", of the one in the
// middle, so that "pdf" less "page" is vlmail's own: its command line, the process that the page is read in,
// the search. Fonts that a PDF does not bring along have to be looked for, which makes the most of
// "pdf_most". Shortest times of the processors, so that what else the machine does falls out.
#include "bench/example_letters.h"
#include "bench/process_time.h"

#include <benchmark/benchmark.h>
#include <poppler-document.h>

#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <map>
#include <memory>
#include <string>
#include <vector>

namespace {

namespace fs = std::filesystem;

/// A letter of one typed page, which is gone again at the end.
class TypedLetter {
public:
    TypedLetter() : file_(fs::temp_directory_path() / ("start_" + std::to_string(::getpid()) + ".txt")) {
        std::ofstream(file_) << std::string(13, '\n') << "Ann Lee\n1 High Street\nLondon W1\n";
    }
    TypedLetter(TypedLetter const&) = delete;
    TypedLetter& operator=(TypedLetter const&) = delete;
    ~TypedLetter() { fs::remove(file_); }

    std::string path() const { return file_.string(); }

private:
    fs::path file_;
};

/// What is laid on letters, or goes along with them, stands in a folder of its own.
bool isLetter(std::string const& pdf) { return fs::path(pdf).parent_path().filename() != "documents"; }

bool hasOnePage(std::string const& pdf) {
    std::unique_ptr<poppler::document> const document(poppler::document::load_from_file(pdf));
    return document && document->pages() == 1;
}

std::vector<std::string> letters() {
    std::vector<std::string> found = Bench::documents();
    std::erase_if(found, [](std::string const& pdf) { return !isLetter(pdf) || !hasOnePage(pdf); });
    return found;
}

/// The shortest of all turns.
class Shortest {
public:
    void run(std::vector<std::string> const& command) {
        double const seconds = Bench::secondsOf(command);
        double& known = seconds_.try_emplace(command, seconds).first->second;
        known = std::min(known, seconds);
    }
    double of(std::vector<std::string> const& command) const { return seconds_.at(command); }

private:
    std::map<std::vector<std::string>, double> seconds_;
};

std::vector<std::string> reading(std::string const& document) {
    return {VLSERVICE_VLMAIL, "letter", document};
}
std::vector<std::string> drawing(std::string const& document) { return {VLSERVICE_PAGE, document}; }

void start(benchmark::State& state) {
    TypedLetter const typed;
    std::vector<std::string> const nothing{VLSERVICE_NOTHING};
    std::vector<std::string> const version{VLSERVICE_VLMAIL, "--version"};
    std::vector<std::string> pdfs = letters();
    std::vector<std::vector<std::string>> commands{nothing, version, reading(typed.path())};
    for (std::string const& pdf : pdfs)
        commands.insert(commands.end(), {reading(pdf), drawing(pdf)});
    Shortest shortest;
    for (auto _ : state)
        for (std::vector<std::string> const& command : commands)
            shortest.run(command);
    auto const times = [&](std::vector<std::string> const& command) {
        return shortest.of(command) / shortest.of(nothing);
    };
    std::ranges::sort(pdfs, {}, [&](std::string const& pdf) { return times(reading(pdf)); });
    std::string const& middle = pdfs[pdfs.size() / 2];
    state.counters["nothing_ms"] = shortest.of(nothing) * 1e3;
    state.counters["version"] = times(version);
    state.counters["letter"] = times(reading(typed.path()));
    state.counters["pdf_least"] = times(reading(pdfs.front()));
    state.counters["pdf"] = times(reading(middle));
    state.counters["pdf_most"] = times(reading(pdfs.back()));
    state.counters["page"] = times(drawing(middle));
}

BENCHMARK(start)->Unit(benchmark::kMillisecond)->Iterations(30);

} // namespace

BENCHMARK_MAIN();
