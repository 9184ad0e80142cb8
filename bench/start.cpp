// What it takes to start vlmail, against a program that is linked with the same libraries and does nothing
// else, in turns: most of it is the loader's, which brings in what the reader of PDFs stands on. Decides
// whether libraries are worth loading late. The aim is 1.5 times for "--version" and for a letter of one page
// as far as it is started; reading a page of a PDF comes on top in "pdf". What poppler takes to read and draw
// that page is in "page", so that "pdf" less "page" is vlmail's own: its command line, the process that the
// page is read in, the search. Shortest times of the processors, so that what else the machine does falls
// out.
#include "bench/example_letters.h"
#include "bench/process_time.h"

#include <benchmark/benchmark.h>

#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
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

void start(benchmark::State& state) {
    TypedLetter const typed;
    std::vector<std::vector<std::string>> const commands{
        {VLSERVICE_NOTHING},
        {VLSERVICE_VLMAIL, "--version"},
        {VLSERVICE_VLMAIL, "letter", typed.path()},
        {VLSERVICE_VLMAIL, "letter", Bench::documents().front()},
        {VLSERVICE_PAGE, Bench::documents().front()}};
    std::vector<double> shortest(commands.size(), 1e9);
    for (auto _ : state)
        for (std::size_t i = 0; i < commands.size(); ++i)
            shortest[i] = std::min(shortest[i], Bench::secondsOf(commands[i]));
    state.counters["nothing_ms"] = shortest[0] * 1e3;
    state.counters["version"] = shortest[1] / shortest[0];
    state.counters["letter"] = shortest[2] / shortest[0];
    state.counters["pdf"] = shortest[3] / shortest[0];
    state.counters["page"] = shortest[4] / shortest[0];
}

BENCHMARK(start)->Unit(benchmark::kMillisecond)->MinTime(4);

} // namespace

BENCHMARK_MAIN();
